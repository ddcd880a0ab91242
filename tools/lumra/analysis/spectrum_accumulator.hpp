// The library's averaged spectrum of complex or real samples, whichever a recording holds. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <lumra/spectrum.hpp>
#include <memory>

#include "analysis/sample_blocks.hpp"

namespace tool {

class spectrum_accumulator {
 public:
  /// Throws lumra::error.
  spectrum_accumulator(const lumra::spectrum_settings &settings, bool real);

  void add(sample_block block) { lumra::check_open(lumra_spectrum_add(average_.get(), block.samples, block.count)); }
  /// The next samples do not follow the ones before.
  void gap() { lumra::check_open(lumra_spectrum_gap(average_.get())); }
  /// Adds what continues this one.
  void merge(const spectrum_accumulator &next) {
    lumra::check_open(lumra_spectrum_merge(average_.get(), next.average_.get()));
  }
  /// Begins a new average; the stream goes on.
  void clear() { lumra::check_open(lumra_spectrum_clear(average_.get())); }
  /// Complete segments.
  [[nodiscard]] std::uint64_t segments() const;
  /// There must be a segment. Throws failure where a power is not finite.
  [[nodiscard]] lumra::averaged_spectrum read() const;

 private:
  struct freed {
    void operator()(lumra_spectrum_average *average) const noexcept { lumra_spectrum_free(average); }
  };
  std::unique_ptr<lumra_spectrum_average, freed> average_;
  bool hold_;
};

}  // namespace tool
