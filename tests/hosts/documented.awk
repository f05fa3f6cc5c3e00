# SPDX-License-Identifier: Apache-2.0
# Prints one program of a text: the fenced C++ numbered `which` (from 1) below the heading `section`.
/^## / { inSection = $0 == "## " section }
/^ *```/ {
  if (!isOpen && inSection && $0 ~ /```cpp$/) isPrinted = ++count == which
  if (isOpen) isPrinted = 0
  isOpen = !isOpen
  next
}
isPrinted
