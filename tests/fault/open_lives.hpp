// What callers of the open interface do, in steps that can be done again after a failure. SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>
#include <lumra/lumra.h>

#include <algorithm>
#include <initializer_list>
#include <type_traits>
#include <vector>

namespace tests {

/// Room and data of one life; nothing of it is allocated inside of a step.
struct open_life {
  std::vector<float> in, out, taps;
  std::vector<unsigned char> bytes;
  std::uint64_t count = 0;
  lumra_fft *fft = nullptr;
  lumra_fir *fir = nullptr, *loaded_fir = nullptr;
  lumra_iir *iir = nullptr, *loaded_iir = nullptr;
  lumra_least_squares *solver = nullptr;
  lumra_resampler *resampler = nullptr;
  lumra_spectrum_average *spectrum = nullptr;
  lumra_level *level = nullptr;
  lumra_channelizer *channels = nullptr;

  open_life() : in(8192), out(16384), taps(300), bytes(1 << 16) {
    for (std::size_t k = 0; k < in.size(); ++k) in[k] = static_cast<float>(k * k % 97) / 97 - 0.5F;
    std::copy_n(in.begin(), taps.size(), taps.begin());
  }
  open_life(const open_life &) = delete;
  open_life &operator=(const open_life &) = delete;
  ~open_life() {
    lumra_fft_free(fft);
    lumra_fir_free(fir);
    lumra_fir_free(loaded_fir);
    lumra_iir_free(iir);
    lumra_iir_free(loaded_iir);
    lumra_least_squares_free(solver);
    lumra_resampler_free(resampler);
    lumra_spectrum_free(spectrum);
    lumra_level_free(level);
    lumra_channelizer_free(channels);
  }
};

using open_step = lumra_status (*)(open_life &);

/// The first failure of calls that follow each other.
inline lumra_status first_of(std::initializer_list<lumra_status> codes) {
  for (const lumra_status code : codes)
    if (code != LUMRA_SUCCESS) return code;
  return LUMRA_SUCCESS;
}

/// An average of other samples, which a failed transform leaves unusable; the one before is freed.
inline lumra_status fresh_spectrum(lumra_spectrum_average *&spectrum, std::uint64_t start, const float *x) {
  lumra_spectrum_free(spectrum);
  spectrum = nullptr;
  lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
  options.type = LUMRA_TYPE_F32;
  options.points = 101;
  options.hold = LUMRA_HOLD_EXTREMES;
  options.threads = 1;
  options.start = start;
  const lumra_status code = lumra_spectrum_create(&options, &spectrum);
  return code != 0 ? code : lumra_spectrum_add(spectrum, x, 1000);
}

/// What it reads becomes the life's result.
inline lumra_status read_spectrum(const lumra_spectrum_average *spectrum, std::vector<float> &out) {
  double rows[3][51];
  lumra_spectrum_info info{};
  info.size = sizeof info;
  const lumra_status code = lumra_spectrum_read(spectrum, &info, rows[0], rows[1], rows[2], 51);
  if (code == 0) std::copy_n(rows[0], 3 * 51, out.begin());
  return code;
}

template <class Samples>
auto *complex(Samples &x) {
  return reinterpret_cast<std::conditional_t<std::is_const_v<Samples>, const lumra_cf32, lumra_cf32> *>(x.data());
}

struct named_life {
  const char *name;
  std::vector<open_step> steps;
};

/// Every object is made, used, saved and loaded; transforms of a prime's length are MKL's hardest.
inline const named_life open_lives[] = {
    {"transforms",
     {[](open_life &l) {
        const lumra_fft_options options{sizeof options, LUMRA_TYPE_CF32, 1009, LUMRA_FFT_SCALE_BACKWARD, 0};
        return lumra_fft_create(&options, &l.fft);
      },
      [](open_life &l) { return lumra_fft_forward(l.fft, l.in.data(), l.out.data(), 3, nullptr); },
      [](open_life &l) {
        const lumra_fft_layout rows{2, 1, 3, 1};
        return lumra_fft_backward(l.fft, l.in.data(), l.out.data(), 2, &rows);
      }}},
    {"FIR filters",
     {[](open_life &l) {
        const lumra_fir_options options{sizeof options, LUMRA_TYPE_F32, 0, LUMRA_METHOD_FOURIER};
        return lumra_fir_create(&options, l.taps.data(), l.taps.size(), &l.fir);
      },
      [](open_life &l) {
        return first_of({lumra_fir_reset(l.fir), lumra_fir_process(l.fir, l.in.data(), l.out.data(), 5000)});
      },
      [](open_life &l) {
        return first_of({lumra_fir_state_size(l.fir, &l.count), lumra_fir_save(l.fir, l.bytes.data(), l.bytes.size())});
      },
      [](open_life &l) {
        lumra_fir_free(l.loaded_fir);
        l.loaded_fir = nullptr;
        const lumra_status code = lumra_fir_load(l.bytes.data(), l.count, &l.loaded_fir);
        return code != 0 ? code : lumra_fir_process(l.loaded_fir, l.in.data(), l.out.data(), 1000);
      }}},
    {"recursive filters",
     {[](open_life &l) {
        const double b[] = {0.1, 0.2, 0.1}, a[] = {1, -1.2, 0.5};
        return lumra_iir_create(nullptr, b, 3, a, 3, &l.iir);
      },
      [](open_life &l) {
        lumra_iir_free(l.iir);
        l.iir = nullptr;
        const double sections[] = {0.1, 0.2, 0.1, 1, -1.2, 0.5, 1, 0, 0, 2, 0.1, 0};
        return lumra_iir_create_sections(nullptr, sections, 2, &l.iir);
      },
      [](open_life &l) {
        double state[8] = {1, 2, 3, 4};
        return first_of({lumra_iir_set_state(l.iir, state, 4),
                         lumra_iir_process(l.iir, l.in.data(), l.out.data(), 1001),
                         lumra_iir_get_state(l.iir, state, 4)});
      },
      [](open_life &l) {
        return first_of({lumra_iir_state_size(l.iir, &l.count), lumra_iir_save(l.iir, l.bytes.data(), l.bytes.size())});
      },
      [](open_life &l) {
        lumra_iir_free(l.loaded_iir);
        l.loaded_iir = nullptr;
        const lumra_status code = lumra_iir_load(l.bytes.data(), l.count, &l.loaded_iir);
        return code != 0 ? code : lumra_iir_process(l.loaded_iir, l.in.data(), l.out.data(), 1000);
      }}},
    {"least squares",
     {[](open_life &l) {
        const lumra_least_squares_options options{sizeof options, LUMRA_TYPE_CF32, 60, 40, 2};
        return lumra_least_squares_create(&options, &l.solver);
      },
      [](open_life &l) {
        return lumra_least_squares_solve(l.solver, l.in.data(), l.in.data(), 0, l.out.data(), &l.count);
      },
      [](open_life &l) {  // singular values are asked for
        return lumra_least_squares_solve(l.solver, l.in.data(), l.in.data(), 0.5, l.out.data(), &l.count);
      }}},
    {"resamplers",
     {[](open_life &l) {
        lumra_resampler_options options = LUMRA_RESAMPLER_OPTIONS;
        options.type = LUMRA_TYPE_F32;
        options.output_rate_hz = 0.7 / 3;
        options.rejection_db = 60;
        options.channels = 2;
        return lumra_resampler_create(&options, &l.resampler);
      },
      [](open_life &l) {
        return first_of(
            {lumra_resampler_reset(l.resampler),
             lumra_resampler_process(l.resampler, l.in.data(), 4000, 4000, l.out.data(), 4000, 4000, &l.count)});
      },
      [](open_life &l) {
        return first_of({lumra_resampler_state_size(l.resampler, &l.count),
                         lumra_resampler_save(l.resampler, l.bytes.data(), l.bytes.size())});
      },
      [](open_life &l) {
        lumra_resampler *loaded = nullptr;
        std::uint64_t written = 0;
        lumra_status code = lumra_resampler_load(l.bytes.data(), l.count, &loaded);
        if (code == 0) code = lumra_resampler_flush(loaded, l.out.data(), 4000, 4000, &written);
        lumra_resampler_free(loaded);
        return code;
      }}},
    {"averaged spectra",
     {[](open_life &l) {
        const lumra_status code = fresh_spectrum(l.spectrum, 0, l.in.data());
        return code != 0 ? code : read_spectrum(l.spectrum, l.out);
      },
      [](open_life &l) {
        lumra_spectrum_average *next = nullptr;
        lumra_status code = fresh_spectrum(l.spectrum, 0, l.in.data());
        if (code == 0) code = fresh_spectrum(next, 1000, l.in.data() + 1000);
        if (code == 0) code = lumra_spectrum_merge(l.spectrum, next);
        lumra_spectrum_free(next);
        return code;
      },
      [](open_life &l) {
        return first_of({lumra_spectrum_state_size(l.spectrum, &l.count),
                         lumra_spectrum_save(l.spectrum, l.bytes.data(), l.bytes.size())});
      },
      [](open_life &l) {
        lumra_spectrum_average *loaded = nullptr;
        lumra_status code = lumra_spectrum_load(l.bytes.data(), l.count, 1, &loaded);
        if (code == 0) code = read_spectrum(loaded, l.out);
        lumra_spectrum_free(loaded);
        return code;
      }}},
    {"levels",
     {[](open_life &l) { return lumra_level_create(nullptr, &l.level); },
      [](open_life &l) {
        lumra_level_result result{};
        result.size = sizeof result;
        const lumra_status code = lumra_level_add(l.level, l.in.data(), 3000);
        return code != 0 ? code : lumra_level_read(l.level, &result);
      },
      [](open_life &l) {
        return first_of(
            {lumra_level_state_size(l.level, &l.count), lumra_level_save(l.level, l.bytes.data(), l.bytes.size())});
      },
      [](open_life &l) {
        lumra_level *loaded = nullptr;
        lumra_status code = lumra_level_load(l.bytes.data(), l.count, &loaded);
        if (code == 0)
          code = lumra_level_merge(l.level, loaded) == LUMRA_OUT_OF_RANGE ? LUMRA_SUCCESS : LUMRA_UNEXPECTED;
        lumra_level_free(loaded);
        return code;
      }}},
    {"channels",
     {[](open_life &l) {
        lumra_channelizer_options options = LUMRA_CHANNELIZER_OPTIONS;
        options.sample_rate_hz = 1e3;
        options.rejection_db = 40;
        const lumra_channelizer_channel channels[] = {{100, 250, 0.5}, {-123.4, 77.7, 0.5}, {321, 2, 0.5}};
        return lumra_channelizer_create(&options, channels, 3, &l.channels);
      },
      [](open_life &l) {
        void *const out[] = {l.out.data(), l.out.data() + 4000, l.out.data() + 8000};
        const std::uint64_t room[] = {2000, 2000, 2000};
        return first_of({lumra_channelizer_reset(l.channels),
                         lumra_channelizer_process(l.channels, l.in.data(), 4096, out, room, nullptr),
                         lumra_channelizer_flush(l.channels, out, room, nullptr),
                         lumra_channelizer_process(l.channels, l.in.data(), 2000, out, room, nullptr)});
      },
      [](open_life &l) {
        return first_of({lumra_channelizer_state_size(l.channels, &l.count),
                         lumra_channelizer_save(l.channels, l.bytes.data(), l.bytes.size())});
      },
      [](open_life &l) {
        lumra_channelizer_free(l.channels);
        l.channels = nullptr;
        return lumra_channelizer_load(l.bytes.data(), l.count, &l.channels);
      }}},
    {"functions",
     {[](open_life &l) {
        return lumra_convolve_f32(l.in.data(), 4000, l.in.data(), 3000, 0, LUMRA_METHOD_FOURIER, l.out.data(), 6999);
      },
      [](open_life &l) {
        return lumra_convolve_with_real_cf32(complex(l.in), 4000, l.taps.data(), 100, 1, LUMRA_METHOD_FOURIER,
                                             complex(l.out), 4000);
      },
      [](open_life &l) {
        return lumra_correlate_cf32(complex(l.in), 1000, complex(l.in), 50, 0, LUMRA_METHOD_DIRECT, complex(l.out),
                                    1049);
      },
      [](open_life &l) {
        const lumra_evm_options options{sizeof options, LUMRA_ALIGN_GAIN | LUMRA_ALIGN_DELAY | LUMRA_ALIGN_FREQUENCY, 1,
                                        2, 0};
        lumra_evm_result result{};
        result.size = sizeof result;
        const lumra_status code =
            lumra_evm_measure_cf32(complex(l.in), complex(l.in), 2000, &options, &result, nullptr, nullptr, nullptr);
        l.out.back() = static_cast<float>(result.gain_re);
        return code;
      },
      [](open_life &l) { return lumra_design_kaiser_lowpass_f32(1, 0.1, 0.12, 80, l.out.data(), l.out.size()); },
      [](open_life &l) { return lumra_design_root_raised_cosine_f32(8, 1, 0.2, 16, l.out.data(), l.out.size()); },
      [](open_life &l) { return lumra_window_make_f32(LUMRA_WINDOW_KAISER, 9, 0, l.out.data(), 1000); },
      [](open_life &l) { return lumra_log2_power_cf32(complex(l.in), 1, 0, l.out.data(), 1000); },
      [](open_life &l) {
        return lumra_lookup_cf32(complex(l.in), l.in.data(), complex(l.taps), 100, 0, 0.1F, complex(l.out), 1000);
      }}},
};

/// Does all steps, the chosen one while fails(armed step) makes calls fail, and again where that failed. What came out
/// in the end.
template <class Fails>
std::vector<float> live_with(const named_life &life, std::size_t chosen, Fails fails) {
  open_life l;
  for (std::size_t k = 0; k < life.steps.size(); ++k) {
    if (k == chosen && fails([&] { return life.steps[k](l); }) == LUMRA_SUCCESS) continue;
    EXPECT_EQ(LUMRA_SUCCESS, life.steps[k](l)) << life.name << ", step " << k << ": " << lumra_last_error();
  }
  return l.out;
}

}  // namespace tests
