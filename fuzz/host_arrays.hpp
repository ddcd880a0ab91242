// The arrays of one call, and the host that they belong to: one that moves every array it is asked to resize, or
// refuses, or throws. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <initializer_list>
#include <memory>
#include <vector>

#include "host/host_array.hpp"
#include "input.hpp"

namespace fuzz {

/// The process's resize service while it lives. Blocks are exactly as long as they say, for the sanitizers.
class hosting {
 public:
  enum class unit { elements, bytes };  // of the size argument

  hosting(input &in, unit size_unit);
  hosting(const hosting &) = delete;
  hosting &operator=(const hosting &) = delete;
  ~hosting();

  /// Whether it has refused, or thrown.
  [[nodiscard]] bool failed() const noexcept { return failed_; }
  [[nodiscard]] bool threw() const noexcept { return failed_ && how_ == behaviour::throwing; }
  [[nodiscard]] bool is_own_allocator() const noexcept { return how_ == behaviour::absent; }

 private:
  enum class behaviour { obliging, refusing, throwing, absent };
  static std::int32_t serve(std::int32_t type, std::int32_t dimensions, void *address, std::uint64_t size);

  behaviour how_ = behaviour::obliging;
  int patience_ = 0;  // calls that are served before the first that is not
  bool once_ = false, failed_ = false;
  unit unit_;
  std::vector<void **> cells_;  // of null handles that were filled
};

enum role : unsigned { reads = 1, writes = 2, works = 4 };

/// An array of a call.
struct array {
  void *block = nullptr;
  void **handle = &block;
  host::element_type type;
  int dimensions = 1;
  unsigned roles = 0;
  bool shared_work = false;  // workspace that has another role, too
  bool tame = true;          // between -1 and 1, no denormals
  std::vector<unsigned char> before;
  std::vector<std::complex<double>> values;  // as they were before the call

  /// As arguments take it.
  template <class Block>
  operator Block **() noexcept {
    return reinterpret_cast<Block **>(handle);
  }
  [[nodiscard]] std::int32_t size(int dimension) const noexcept;  // 0 where there is none
  [[nodiscard]] std::size_t count() const noexcept;
  [[nodiscard]] std::size_t bytes() const noexcept;
  [[nodiscard]] std::vector<std::complex<double>> now() const;
};

/// Deals out arrays: new ones, ones that another argument has already, empty ones, null blocks and null handles.
class call {
 public:
  call(input &in, hosting &host) noexcept : in_(in), host_(host) {}
  call(const call &) = delete;
  call &operator=(const call &) = delete;
  ~call();

  template <class Block>
  array &give(role as, int rows = -1, int columns = -1) {
    return give(
        host::type_of<host::element_of<Block>>, requires(Block b) { b.rows; } ? 2 : 1, as, rows, columns);
  }
  array &give(host::element_type type, int dimensions, role as, int rows, int columns);

  /// No array is there twice or without a handle, and the host has done what it was asked for.
  [[nodiscard]] bool plain() const noexcept { return plain_ && !host_.failed(); }
  [[nodiscard]] bool host_threw() const noexcept { return host_.threw(); }
  /// Whether the call has anything to do: one without does not look whether arrays are shared.
  void set_idle(bool idle) noexcept { idle_ = idle; }
  /// Workspace is empty and what is only read unchanged; the code is a listed one; failures leave empty outputs.
  bool check(std::int32_t code, std::initializer_list<std::int32_t> codes, int line = __builtin_LINE()) const;
  /// What is only read is unchanged.
  void check_inputs(int line = __builtin_LINE()) const;

 private:
  input &in_;
  hosting &host_;
  bool plain_ = true, idle_ = false;
  std::vector<std::unique_ptr<array>> arrays_;
};

/// 0, or a number of the list. Whether it is a failure.
inline bool check_code(std::int32_t code, std::initializer_list<std::int32_t> codes, int line = __builtin_LINE()) {
  hold(code == 0 || std::find(codes.begin(), codes.end(), code) != codes.end(), "code is not a documented one", line);
  return code != 0;
}

}  // namespace fuzz
