// SPDX-License-Identifier: MIT
#include "recording/wav.hpp"

#include <fcntl.h>
#include <sndfile.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <limits>
#include <utility>

#include "recording/failure.hpp"
#include "recording/file.hpp"

namespace recording {
namespace {

namespace fs = std::filesystem;

struct subtype_entry {
  int subtype;
  component type;
};
constexpr subtype_entry subtypes[] = {{SF_FORMAT_PCM_U8, component::u8},  {SF_FORMAT_PCM_16, component::i16},
                                      {SF_FORMAT_PCM_24, component::i24}, {SF_FORMAT_PCM_32, component::i32},
                                      {SF_FORMAT_FLOAT, component::f32},  {SF_FORMAT_DOUBLE, component::f64}};

int subtype_of(component type) {
  return std::find_if(std::begin(subtypes), std::end(subtypes), [=](const auto &e) { return e.type == type; })->subtype;
}

std::string subtype_name(int subtype) {
  SF_FORMAT_INFO info{subtype, nullptr, nullptr};
  return sf_command(nullptr, SFC_GET_FORMAT_INFO, &info, sizeof info) == 0 && info.name ? info.name : "unknown type";
}

struct sound_closer {
  void operator()(SNDFILE *file) const noexcept { (void)sf_close(file); }
};
using sound = std::unique_ptr<SNDFILE, sound_closer>;

class wav_reader final : public byte_reader {
 public:
  explicit wav_reader(fs::path path)
      : path_(std::move(path)), file_(::open(path_.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK)) {
    if (!file_.is_open()) throw failure("{}: {}", path_.string(), system_reason(errno));
    sound_.reset(sf_open_fd(file_.get(), SFM_READ, &info_, SF_FALSE));
    if (!sound_) throw failure("{}: not a WAV file that can be read: {}", path_.string(), sf_strerror(nullptr));
  }

  [[nodiscard]] const SF_INFO &info() const noexcept { return info_; }
  [[nodiscard]] int subtype() const noexcept { return info_.format & SF_FORMAT_SUBMASK; }
  [[nodiscard]] bool is_big_endian() const noexcept {
    return sf_command(sound_.get(), SFC_RAW_DATA_NEEDS_ENDSWAP, nullptr, 0) == SF_TRUE;
  }
  void set_frame(std::size_t bytes) noexcept { frame_ = bytes; }

  /// Whole frames are read, from the beginning of one.
  std::size_t read(std::uint64_t offset, std::span<std::byte> to) override {
    if (offset != position_ && sf_seek(sound_.get(), static_cast<sf_count_t>(offset / frame_), SEEK_SET) < 0)
      throw failure("{}: {}", path_.string(), sf_strerror(sound_.get()));
    const sf_count_t got = sf_read_raw(sound_.get(), to.data(), static_cast<sf_count_t>(to.size()));
    if (got < 0) throw failure("{}: {}", path_.string(), sf_strerror(sound_.get()));
    position_ = offset + static_cast<std::uint64_t>(got);
    return static_cast<std::size_t>(got);
  }

 private:
  fs::path path_;
  descriptor file_;
  SF_INFO info_{};
  sound sound_;
  std::size_t frame_ = 1;
  std::uint64_t position_ = 0;
};

}  // namespace

bool has_wav_suffix(const fs::path &path) {
  std::string suffix = path.extension().string();
  for (char &c : suffix) c = static_cast<char>(c >= 'A' && c <= 'Z' ? c + ('a' - 'A') : c);
  return suffix == ".wav" || suffix == ".wave" || suffix == ".w64" || suffix == ".rf64";
}

std::optional<source> open_wav(const fs::path &path, const options &said) {
  if (!has_wav_suffix(path)) return std::nullopt;
  if (said.format)
    throw failure("{}: a WAV file says its sample type itself; leave out {}", path.string(), said.names.format);
  readable_size(path);
  const wav_reader opened(path);
  const int major = opened.info().format & SF_FORMAT_TYPEMASK;
  if (major != SF_FORMAT_WAV && major != SF_FORMAT_WAVEX && major != SF_FORMAT_RF64 && major != SF_FORMAT_W64)
    throw failure("{}: not a WAV file; is its name right?", path.string());
  const auto known = std::find_if(std::begin(subtypes), std::end(subtypes),
                                  [&](const auto &e) { return e.subtype == opened.subtype(); });
  source result;
  result.datatype = subtype_name(opened.subtype());
  if (known == std::end(subtypes))
    throw failure("{}: samples of type {} are not read; save them as PCM or floating point", path.string(),
                  result.datatype);
  const auto channels = static_cast<std::uint64_t>(opened.info().channels);
  result.format = {known->type, channels % 2 == 0, opened.is_big_endian()};
  result.channels = channels / result.format.components();
  result.rate = said.rate.value_or(opened.info().samplerate);
  if (!(result.rate > 0))
    throw failure("{}: a sample rate of {} Hz; say {} HZ", path.string(), result.rate, said.names.rate);
  result.samples = static_cast<std::uint64_t>(std::max<sf_count_t>(opened.info().frames, 0));
  result.captures.emplace_back().samples = result.samples;
  result.extents = {{0, result.samples, 0}};
  result.name = path.stem().string();
  result.data = path;
  result.files = {path};
  result.bytes = [path, frame = result.channels * result.format.bytes()] {
    auto reader = std::make_unique<wav_reader>(path);
    reader->set_frame(frame);
    return reader;
  };
  return result;
}

sample_format wav_format(const sample_format &of) {
  sample_format result{of.type, of.is_complex, false};
  if (of.type == component::i8) result.type = component::i16;
  if (of.type == component::u16) result.type = component::i32;
  if (of.type == component::u32) result.type = component::f64;
  return result;
}

std::string wav_datatype(const sample_format &format) {
  return subtype_name(subtype_of(format.type));
}

struct wav_writer::file {
  sound opened;
};

wav_writer::wav_writer(int descriptor, std::string name, const sample_format &format, double rate,
                       std::uint64_t samples)
    : name_(std::move(name)), file_(std::make_unique<file>()) {
  if (rate != std::round(rate) || !(rate <= std::numeric_limits<int>::max()))
    throw failure("{}: a WAV file has a whole number of samples a second, not {}; write SigMF, or resample", name_,
                  rate);
  SF_INFO info{};
  info.samplerate = static_cast<int>(rate);
  info.channels = static_cast<int>(format.components());
  // Sizes in a plain header have 32 bits; a little of that is the header's own.
  constexpr std::uint64_t largest_plain = 0xFFFF0000;
  info.format = (samples <= largest_plain / format.bytes() ? SF_FORMAT_WAV : SF_FORMAT_RF64) | subtype_of(format.type);
  errno = 0;
  file_->opened.reset(sf_open_fd(descriptor, SFM_WRITE, &info, SF_FALSE));
  if (!file_->opened) refuse(sf_strerror(nullptr));
  (void)sf_command(file_->opened.get(), SFC_RF64_AUTO_DOWNGRADE, nullptr, SF_TRUE);
}

wav_writer::~wav_writer() = default;

void wav_writer::write(std::span<const std::byte> bytes) {
  errno = 0;
  const auto count = static_cast<sf_count_t>(bytes.size());
  if (sf_write_raw(file_->opened.get(), bytes.data(), count) != count) refuse(sf_strerror(file_->opened.get()));
}

void wav_writer::finish() {
  errno = 0;
  if (const int code = sf_close(file_->opened.release()); code != 0) refuse(sf_error_number(code));
}

void wav_writer::refuse(const char *reason) const {
  throw failure("cannot write {}: {}", name_, errno != 0 ? system_reason(errno) : reason);
}

}  // namespace recording
