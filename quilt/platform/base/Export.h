// SPDX-License-Identifier: Apache-2.0
#pragma once

/// Marks what the shared libraries show: every public class that is more than its header, and every public function.
/// The rest is compiled hidden.
#define QUILT_EXPORT [[gnu::visibility("default")]]
