// SPDX-License-Identifier: Apache-2.0
#include "tests/support/DecimalComma.h"

#include <clocale>
#include <cstdlib>

#include "tests/support/PlainFiles.h"

namespace quilt::support {

namespace {

// Few systems have a language with a decimal comma installed; all of them have the tool that makes one.
constexpr const char* kLanguage = R"(escape_char /
LC_NUMERIC
decimal_point ","
thousands_sep "."
grouping 3;3
END LC_NUMERIC
)";

}  // namespace

DecimalComma::DecimalComma() : _before(std::setlocale(LC_ALL, nullptr)) {
  writePlainly(_folder / "source", kLanguage);
  const std::string command = "localedef -c -i '" + (_folder / "source").native() + "' -f ANSI_X3.4-1968 '" +
                              (_folder / "xx_XX").native() + "' >/dev/null 2>&1";
  if (std::system(command.c_str()) != 0) {
    // It answers 1 for its warnings too; whether there is a language shows below.
  }
  setenv("LOCPATH", _folder.path().c_str(), 1);
  std::setlocale(LC_ALL, "xx_XX");
}

DecimalComma::~DecimalComma() {
  std::setlocale(LC_ALL, _before.c_str());
  unsetenv("LOCPATH");
}

bool DecimalComma::isInForce() const { return *std::localeconv()->decimal_point == ','; }

}  // namespace quilt::support
