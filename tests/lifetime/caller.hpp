// Calls of every family of the library through its public headers, each with a result that can be told right from
// wrong. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/lumra.h>

#include <cstdint>

namespace lifetime {

inline constexpr int family_count = 12;

/// What threads may use together: a session, and a FIFO of a kilobyte.
struct shared_objects {
  shared_objects();
  shared_objects(const shared_objects &) = delete;
  shared_objects &operator=(const shared_objects &) = delete;
  ~shared_objects();

  std::uint64_t session = 0, fifo = 0;
  std::uint64_t *fifo_cell = nullptr;
};

/// One thread's own arrays and slots. The number, 0 to 14, tells its objects from those of others.
class caller {
 public:
  caller(shared_objects &shared, int number);
  caller(const caller &) = delete;
  caller &operator=(const caller &) = delete;
  ~caller();

  /// One or several calls of a family, 0 to family_count - 1; true when all went as they should.
  bool call(int family);
  bool call_all();

 private:
  bool host_arrays();
  bool own_session();
  bool shared_session();
  bool session_log();
  bool stored_arrays();
  bool filters();
  bool fifos();
  bool resampler();
  bool toolkit_transforms();
  bool toolkit_matrices();
  bool open_objects();
  bool lookup_and_errors();

  shared_objects &shared_;
  const int number_;
  int round_ = 0;
  lumra_cf32_array samples_ = nullptr, spectrum_ = nullptr, scratch_ = nullptr, long_in_ = nullptr, long_out_ = nullptr,
                   table_ = nullptr;
  lumra_f32_array power_ = nullptr, keys_ = nullptr, x_ = nullptr, work_[3]{};
  lumra_f32_matrix matrix_ = nullptr;
  void *slot_ = nullptr;
};

}  // namespace lifetime
