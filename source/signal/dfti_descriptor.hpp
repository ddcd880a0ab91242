// An MKL transform and who frees it. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_dfti.h>

#include <array>
#include <cstdint>
#include <memory>
#include <optional>

#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_section.hpp"
#include "signal/failure.hpp"

namespace dsp {

/// Longest transform in points. Sizes beyond it make MKL 2020.4 divide by zero or run without end.
inline constexpr std::uint64_t most_fft_points = std::uint64_t{1} << 27;

/// What a transform was being asked when it failed.
enum class dfti_step { create, copy, placement, storage, scale, commit, lengths, forward, backward };

class dfti_failure : public transform_failure {
 public:
  dfti_failure(dfti_step step, MKL_LONG status) noexcept;
  [[nodiscard]] dfti_step step() const noexcept { return step_; }
  [[nodiscard]] MKL_LONG status() const noexcept { return status_; }

 private:
  dfti_step step_;
  MKL_LONG status_;
};

struct dfti_settings {
  DFTI_CONFIG_VALUE precision = DFTI_SINGLE;
  DFTI_CONFIG_VALUE domain = DFTI_COMPLEX;  // spectra of real records are the half with the bins from 0 on
  MKL_LONG lengths[2] = {1, 0};             // points and 0 for one dimension, or rows and columns
  bool in_place = false;
  double forward_scale = 1, backward_scale = 1;

  friend bool operator==(const dfti_settings &, const dfti_settings &) = default;
};

/// A step that failed, without MKL's text, which would take memory.
struct failed_step {
  dfti_step step;
  MKL_LONG status;
};

/// Creates, sets up and commits a descriptor, inside of an mkl_section. The step that failed, if any: what was created
/// so far is the caller's to free while `watched` lasts.
std::optional<failed_step> make_descriptor(DFTI_DESCRIPTOR_HANDLE &made, const dfti_settings &settings,
                                           const qsrfhs::mkl_memory::watch &watched) noexcept;

/// A committed descriptor, or none. All throw dfti_failure.
class dfti_descriptor {
 public:
  dfti_descriptor() = default;
  explicit dfti_descriptor(const dfti_settings &settings);
  /// A copy with workspace of its own.
  dfti_descriptor(const dfti_descriptor &other);
  dfti_descriptor(dfti_descriptor &&) = default;
  dfti_descriptor &operator=(dfti_descriptor &&) = default;

  explicit operator bool() const noexcept { return static_cast<bool>(handle_); }

  /// As MKL has them, in the form of the settings.
  [[nodiscard]] std::array<MKL_LONG, 2> lengths() const;
  /// False when MKL reports an error; the descriptor is gone nevertheless.
  bool free() noexcept;

  // In place, and from one memory to another, as the settings say.
  void forward(void *data) const {
    compute([&] { return DftiComputeForward(handle_.get(), data); }, dfti_step::forward);
  }
  /// For callers with a section around many transforms: entering another one takes as long as some of the shortest.
  void forward(void *data, const qsrfhs::mkl_section & /*around*/) const {
    check(qsrfhs::mkl_memory::watched_status([&] { return DftiComputeForward(handle_.get(), data); }),
          dfti_step::forward);
  }
  void forward(const void *in, void *out, const qsrfhs::mkl_section & /*around*/) const {
    check(qsrfhs::mkl_memory::watched_status(
              [&] { return DftiComputeForward(handle_.get(), const_cast<void *>(in), out); }),
          dfti_step::forward);
  }
  void backward(void *data) const {
    compute([&] { return DftiComputeBackward(handle_.get(), data); }, dfti_step::backward);
  }
  void forward(const void *in, void *out) const {
    compute([&] { return DftiComputeForward(handle_.get(), const_cast<void *>(in), out); }, dfti_step::forward);
  }
  void backward(const void *in, void *out) const {
    compute([&] { return DftiComputeBackward(handle_.get(), const_cast<void *>(in), out); }, dfti_step::backward);
  }

 private:
  struct release {
    void operator()(DFTI_DESCRIPTOR *descriptor) const noexcept {
      const qsrfhs::mkl_section section;
      (void)DftiFreeDescriptor(&descriptor);
    }
  };
  using owned = std::unique_ptr<DFTI_DESCRIPTOR, release>;

  template <class Call>
  static void compute(Call call, dfti_step step) {
    const qsrfhs::mkl_section section;
    check(qsrfhs::mkl_memory::watched_status(call), step);
  }
  static void check(MKL_LONG status, dfti_step step) {
    if (status != 0) [[unlikely]]
      fail_unless_no_error(status, step);
  }
  static void fail_unless_no_error(MKL_LONG status, dfti_step step);

  owned handle_;
};

}  // namespace dsp
