// SPDX-License-Identifier: MIT
#include "signal/block_transform.hpp"

#include <algorithm>
#include <array>
#include <mutex>
#include <utility>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "qsrfhs/math/mkl_runtime.hpp"

namespace dsp {
namespace {

struct transform_kind {
  DFTI_CONFIG_VALUE precision, domain;
  std::size_t length;
  friend bool operator==(const transform_kind &, const transform_kind &) = default;
};

template <class Sample>
transform_kind kind_of(std::size_t length) noexcept {
  return {sizeof(real_of<Sample>) == sizeof(double) ? DFTI_DOUBLE : DFTI_SINGLE,
          is_complex<Sample> ? DFTI_COMPLEX : DFTI_REAL, length};
}

/// The latest few descriptors that nobody uses.
class idle_descriptors {
 public:
  static idle_descriptors &instance() noexcept {
    static platform::immortal<idle_descriptors> kept;
    return kept.get();
  }

  /// None where there is none of that kind.
  dfti_descriptor take(const transform_kind &kind) {
    const std::lock_guard lock(mutex_);
    const auto found = std::find_if(idle_.begin(), idle_.end(),
                                    [&](const entry &idle) { return idle.descriptor && idle.kind == kind; });
    return found == idle_.end() ? dfti_descriptor() : std::move(found->descriptor);
  }
  /// In the place of the one that came before all others.
  void keep(const transform_kind &kind, dfti_descriptor descriptor) {
    constexpr std::size_t longest = 1 << 16;  // so that all idle ones together have a few megabytes
    if (!descriptor || kind.length > longest) return;
    const std::lock_guard lock(mutex_);
    std::swap(idle_[oldest_].descriptor, descriptor);
    idle_[oldest_].kind = kind;
    oldest_ = (oldest_ + 1) % idle_.size();
  }

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  struct entry {
    transform_kind kind;
    dfti_descriptor descriptor;
  };
  std::mutex mutex_;
  std::array<entry, 8> idle_{};  // under mutex_, as below
  std::size_t oldest_ = 0;
};

const platform::fork_participant<idle_descriptors> takes_part(platform::fork_rank::idle_transforms);

}  // namespace

template <class Sample>
block_transform<Sample>::block_transform(std::size_t length)
    : length_(length), descriptor_(idle_descriptors::instance().take(kind_of<Sample>(length))) {
  if (descriptor_) return;
  const qsrfhs::mkl_runtime::use in_use;
  const auto kind = kind_of<Sample>(length);
  descriptor_ = dfti_descriptor(
      dfti_settings{.precision = kind.precision, .domain = kind.domain, .lengths = {static_cast<MKL_LONG>(length), 0}});
}

template <class Sample>
block_transform<Sample>::~block_transform() {
  idle_descriptors::instance().keep(kind_of<Sample>(length_), std::move(descriptor_));
}

template class block_transform<float>;
template class block_transform<double>;
template class block_transform<std::complex<float>>;
template class block_transform<std::complex<double>>;

}  // namespace dsp
