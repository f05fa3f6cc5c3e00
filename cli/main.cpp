// SPDX-License-Identifier: Apache-2.0
#include <vector>

#include "cli/DiskTrouble.h"
#include "cli/Interrupt.h"
#include "cli/Program.h"
#include "quilt/platform/install.h"

int main(int argc, char** argv) {
  quilt::cli::Interrupt::listen();
  quilt::platform::install();
  quilt::cli::DiskTrouble::listen();
  return quilt::cli::run(std::vector<std::string>(argv + 1, argv + argc));
}
