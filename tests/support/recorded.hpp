// What was recorded in the process's list of failures since. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/core_services.h>

#include <cstdint>
#include <vector>

namespace tests {

class recorded {
 public:
  recorded() { qsrfhs_getErrorCnt(&before_); }

  [[nodiscard]] std::vector<std::int32_t> codes() const {
    std::uint64_t count = 0;
    qsrfhs_getErrorCnt(&count);
    std::vector<std::int32_t> all(count);
    qsrfhs_getErrors(all.data(), count);
    return {all.begin() + static_cast<std::ptrdiff_t>(before_), all.end()};
  }

 private:
  std::uint64_t before_ = 0;
};

}  // namespace tests
