// libFuzzer's side of the targets of the C interface. SPDX-License-Identifier: MIT
#include "input.hpp"

extern "C" int LLVMFuzzerInitialize(int *, char ***) {
  // Recorded failures print a line each; libFuzzer reports on the standard error.
  return std::freopen("/dev/null", "w", stdout) ? 0 : 1;
}

extern "C" int LLVMFuzzerTestOneInput(const unsigned char *data, std::size_t size) {
  fuzz::input in(data, size);
  fuzz::run(in);
  return 0;
}
