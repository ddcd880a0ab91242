// What changes rates, with any options and any cuts: no crash, no word outside of the arrays, as many samples as were
// announced, and the same bits as from one call, through refused calls and saved states. SPDX-License-Identifier: MIT
#include <lumra/lumra.h>

#include <algorithm>
#include <memory>
#include <numeric>
#include <vector>

#include "open_arrays.hpp"

namespace fuzz {
namespace {

using counts = std::vector<std::uint64_t>;
using bytes = std::vector<unsigned char>;

/// A resampler or a channelizer: samples come in, and rows of samples go out.
class stream {
 public:
  virtual ~stream() = default;
  /// Samples of each output that the next n inputs give; a flush where n is none. Empty where that is refused.
  virtual counts announced(std::uint64_t n) = 0;
  virtual lumra_status process(const void *in, std::uint64_t n, std::vector<bytes> &out, counts &room) = 0;
  virtual lumra_status flush(std::vector<bytes> &out, counts &room) = 0;
  virtual bytes save() = 0;
  /// An object of the same kind from a state; null where that is refused.
  virtual std::unique_ptr<stream> load(const bytes &state) = 0;

  std::size_t in_size = 1, out_size = 1;  // bytes of a sample
};

constexpr std::uint64_t flushed = ~std::uint64_t{0};

void documented(lumra_status code) {
  hold(code == LUMRA_SUCCESS || (code >= LUMRA_BAD_STATE && code <= LUMRA_NULL_ARGUMENT), "a documented code");
  hold(code == LUMRA_SUCCESS || std::strncmp(lumra_last_error(), "lumra_", 6) == 0, "a sentence");
}

template <class Object>
bytes saved(const Object *object, lumra_status (*size_of_state)(const Object *, std::uint64_t *),
            lumra_status (*save)(const Object *, void *, std::uint64_t)) {
  std::uint64_t size = 0;
  hold(size_of_state(object, &size) == LUMRA_SUCCESS, "a size");
  bytes state(size);
  hold(save(object, state.data(), size) == LUMRA_SUCCESS, "a state");
  return state;
}

class resampler final : public stream {
 public:
  explicit resampler(lumra_resampler *object) : object_(object) {
    lumra_resampler_options options{};
    options.size = sizeof options;
    hold(lumra_resampler_get_options(object, &options) == LUMRA_SUCCESS, "options");
    rows_ = options.channels;
    in_size = out_size = size_of(options.type);
  }
  resampler(const resampler &) = delete;
  resampler &operator=(const resampler &) = delete;
  ~resampler() override { lumra_resampler_free(object_); }

  counts announced(std::uint64_t n) override {
    std::uint64_t count = 0;
    const lumra_status code =
        n == flushed ? lumra_resampler_flush_count(object_, &count) : lumra_resampler_output_count(object_, n, &count);
    documented(code);
    return code == LUMRA_SUCCESS ? counts(rows_, count) : counts();
  }
  lumra_status process(const void *in, std::uint64_t n, std::vector<bytes> &out, counts &room) override {
    // All rows have the same input.
    return in_rows(out, room, [&](void *rows, std::uint64_t stride) {
      return lumra_resampler_process(object_, in, 0, n, rows, stride, room[0], &room[0]);
    });
  }
  lumra_status flush(std::vector<bytes> &out, counts &room) override {
    return in_rows(out, room, [&](void *rows, std::uint64_t stride) {
      return lumra_resampler_flush(object_, rows, stride, room[0], &room[0]);
    });
  }
  bytes save() override { return saved(object_, &lumra_resampler_state_size, &lumra_resampler_save); }
  std::unique_ptr<stream> load(const bytes &state) override {
    lumra_resampler *made = nullptr;
    const lumra_status code = lumra_resampler_load(state.data(), state.size(), &made);
    documented(code);
    return code == LUMRA_SUCCESS ? std::make_unique<resampler>(made) : nullptr;
  }

 private:
  template <class Call>
  lumra_status in_rows(std::vector<bytes> &out, counts &room, Call call) {
    bytes rows(rows_ * room[0] * out_size);
    const lumra_status code = call(rows.data(), room[0]);
    std::fill(room.begin(), room.end(), room[0]);
    const std::size_t length = room[0] * out_size;
    for (std::size_t k = 0; k < rows_; ++k)
      out[k].assign(rows.begin() + static_cast<std::ptrdiff_t>(k * length),
                    rows.begin() + static_cast<std::ptrdiff_t>((k + 1) * length));
    return code;
  }

  lumra_resampler *object_;
  std::size_t rows_;
};

class channelizer final : public stream {
 public:
  explicit channelizer(lumra_channelizer *object) : object_(object) {
    std::int32_t type = 0;
    hold(lumra_channelizer_get_type(object, &type) == LUMRA_SUCCESS, "a type");
    hold(lumra_channelizer_get_count(object, &count_) == LUMRA_SUCCESS, "channels");
    in_size = size_of(type);
    out_size = 2 * real_size(type);
  }
  channelizer(const channelizer &) = delete;
  channelizer &operator=(const channelizer &) = delete;
  ~channelizer() override { lumra_channelizer_free(object_); }

  counts announced(std::uint64_t n) override {
    counts found(count_);
    const lumra_status code = n == flushed ? lumra_channelizer_flush_counts(object_, found.data())
                                           : lumra_channelizer_output_counts(object_, n, found.data());
    documented(code);
    return code == LUMRA_SUCCESS ? found : counts();
  }
  lumra_status process(const void *in, std::uint64_t n, std::vector<bytes> &out, counts &room) override {
    const auto to = addresses(out, room);
    return lumra_channelizer_process(object_, in, n, to.data(), room.data(), room.data());
  }
  lumra_status flush(std::vector<bytes> &out, counts &room) override {
    const auto to = addresses(out, room);
    return lumra_channelizer_flush(object_, to.data(), room.data(), room.data());
  }
  bytes save() override { return saved(object_, &lumra_channelizer_state_size, &lumra_channelizer_save); }
  std::unique_ptr<stream> load(const bytes &state) override {
    lumra_channelizer *made = nullptr;
    const lumra_status code = lumra_channelizer_load(state.data(), state.size(), &made);
    documented(code);
    return code == LUMRA_SUCCESS ? std::make_unique<channelizer>(made) : nullptr;
  }

 private:
  std::vector<void *> addresses(std::vector<bytes> &out, const counts &room) const {
    std::vector<void *> to(count_);
    for (std::size_t k = 0; k < count_; ++k) {
      out[k].resize(room[k] * out_size);
      to[k] = out[k].data();
    }
    return to;
  }

  lumra_channelizer *object_;
  std::uint64_t count_ = 0;
};

double rate(input &in) {
  constexpr double rates[] = {1, 3, 10, 7.68, 9.99, 44100, 48000, 1e6 / 3, 3.141592653589793, 1e-3, 0.7, 640};
  return in.one_in(16) ? in.raw<double>() : rates[in.choice(std::size(rates))];
}
double passband(input &in) {
  return in.one_in(16) ? in.real() : 0.1 * (1 + in.choice(9));
}
double rejection(input &in) {
  return in.one_in(16) ? 100 * in.real() : 40 + in.choice(81);
}

std::unique_ptr<stream> any_resampler(input &in) {
  lumra_resampler_options options = LUMRA_RESAMPLER_OPTIONS;
  options.type = any_type(in);
  options.input_rate_hz = rate(in);
  options.output_rate_hz = rate(in);
  if (in.one_in(8)) options.up = in.byte(), options.down = in.raw<std::uint32_t>();
  options.passband = passband(in);
  options.rejection_db = rejection(in);
  options.channels = in.one_in(4) ? in.choice(4) : 1;
  lumra_resampler *made = nullptr;
  const record<lumra_resampler_options> with(in, options, LUMRA_RESAMPLER_OPTIONS);
  const lumra_status code = lumra_resampler_create(with.address, &made);
  documented(code);
  return code == LUMRA_SUCCESS ? std::make_unique<resampler>(made) : nullptr;
}

std::unique_ptr<stream> any_channelizer(input &in) {
  lumra_channelizer_options options = LUMRA_CHANNELIZER_OPTIONS;
  options.type = any_type(in);
  options.sample_rate_hz = rate(in);
  options.rejection_db = rejection(in);
  std::vector<lumra_channelizer_channel> channels(in.choice(4));
  for (lumra_channelizer_channel &each : channels)
    each = {options.sample_rate_hz * in.real() / 2, options.sample_rate_hz / (1 + in.choice(40)), passband(in)};
  if (!channels.empty() && in.one_in(4)) channels[0].rate_hz = rate(in);
  lumra_channelizer *made = nullptr;
  const record<lumra_channelizer_options> with(in, options, LUMRA_CHANNELIZER_OPTIONS);
  const lumra_status code = lumra_channelizer_create(with.address, channels.data(), channels.size(), &made);
  documented(code);
  return code == LUMRA_SUCCESS ? std::make_unique<channelizer>(made) : nullptr;
}

/// More than that is not computed.
constexpr std::uint64_t most_outputs = 1U << 18;

/// Gives n samples, or ends the stream, and appends what comes. False where too much would.
bool give(stream &to, const unsigned char *samples, std::uint64_t n, std::vector<bytes> &all) {
  counts room = to.announced(n);
  hold(!room.empty(), "a count");
  if (std::accumulate(room.begin(), room.end(), std::uint64_t{0}) > most_outputs) return false;
  const counts wanted = room;
  std::vector<bytes> out(room.size());
  hold((n == flushed ? to.flush(out, room) : to.process(samples, n, out, room)) == LUMRA_SUCCESS, "samples");
  hold(room == wanted, "as many samples as were announced");
  all.resize(out.size());
  for (std::size_t k = 0; k < out.size(); ++k) all[k].insert(all[k].end(), out[k].begin(), out[k].end());
  return true;
}

/// A call that is refused: no input, or a place too few.
void interfere(input &in, stream &with, std::uint64_t n) {
  counts room = with.announced(n);
  std::vector<bytes> out(room.size());
  const std::uint64_t total = std::accumulate(room.begin(), room.end(), std::uint64_t{0});
  if (total == 0 || total > most_outputs) return;
  const bytes samples(n * with.in_size);
  const bool little = in.flag();
  if (little) --*std::max_element(room.begin(), room.end());
  hold(with.process(little ? samples.data() : nullptr, n, out, room) != LUMRA_SUCCESS, "a refused call");
}

/// The saved state goes on; one that is damaged, also below its checksum, is refused or an object.
void reload(input &in, std::unique_ptr<stream> &of) {
  const bytes state = of->save();
  bytes damaged = state;
  for (unsigned k = 0; k <= in.choice(3); ++k)
    damaged[(in.flag() ? in.byte() : in.raw<std::uint32_t>()) % damaged.size()] ^=
        static_cast<unsigned char>(1 + in.choice(255));
  if (in.flag()) seal(damaged);
  if (const auto other = of->load(damaged)) (void)other->announced(in.byte());
  of = of->load(state);
  hold(of != nullptr && of->save() == state, "the state that was saved");
}

}  // namespace

void run(input &in) {
  std::unique_ptr<stream> cut = in.flag() ? any_resampler(in) : any_channelizer(in);
  if (!cut) return;
  const std::unique_ptr<stream> whole = cut->load(cut->save());
  hold(whole != nullptr, "a second one");
  std::uint64_t n = static_cast<std::uint64_t>(in.count()) * (1 + in.choice(32));
  bytes samples(n * cut->in_size);
  auto *const first = reinterpret_cast<char *>(samples.data());
  if (cut->in_size % 8 == 0)
    fill<double>(in, first, samples.size() / 8);
  else
    fill<float>(in, first, samples.size() / 4);
  std::vector<bytes> at_once, in_pieces;
  if (!give(*whole, samples.data(), n, at_once) || !give(*whole, nullptr, flushed, at_once)) return;
  for (std::uint64_t done = 0; done < n;) {
    const std::uint64_t count = in.left() ? std::min<std::uint64_t>(n - done, in.raw<std::uint16_t>()) : n - done;
    if (in.one_in(4)) interfere(in, *cut, count);
    if (in.one_in(4)) reload(in, cut);
    hold(give(*cut, samples.data() + done * cut->in_size, count, in_pieces), "not more than at once");
    done += count;
  }
  hold(give(*cut, nullptr, flushed, in_pieces), "not more than at once");
  hold(n == 0 || in_pieces == at_once, "the same bits");
}

}  // namespace fuzz
