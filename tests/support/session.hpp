// A session that closes itself. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/session.h>

#include <cstdint>
#include <stdexcept>
#include <string>

namespace tests {

class open_session {
 public:
  open_session() {
    if (qsLumraAlgo_CreateSession(&handle_) != 0) throw std::runtime_error("no session");
  }
  open_session(const open_session &) = delete;
  open_session &operator=(const open_session &) = delete;
  ~open_session() { qsLumraAlgo_CloseSession(handle_); }

  operator std::uint64_t() const noexcept { return handle_; }

  /// The oldest entry of the log; waits where there is none.
  [[nodiscard]] std::string read_log() const {
    char text[512] = "";
    qsLumraAlgo_ReadLog(handle_, 0.0, text, sizeof text);
    return text;
  }

 private:
  std::uint64_t handle_ = 0;
};

}  // namespace tests
