// C++20 on top of the C interface: owning types whose functions throw lumra::error, which carries the status.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/lumra.h>

#include <algorithm>
#include <array>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <new>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>

namespace lumra {

/// A status code with the library's own message.
class status {
 public:
  constexpr status() noexcept = default;
  constexpr explicit status(std::int32_t code) noexcept : code_(code) {}

  [[nodiscard]] constexpr bool ok() const noexcept { return code_ == LUMRA_SUCCESS; }
  [[nodiscard]] constexpr std::int32_t code() const noexcept { return code_; }

  [[nodiscard]] std::string message() const {
    if (ok()) return "Success";
    const std::int32_t length = qsLumraAlgo_GetErrorString(0, code_, 0, nullptr);
    std::string text(static_cast<std::size_t>(length) + 2, '\0');
    if (qsLumraAlgo_GetErrorString(0, code_, length + 2, text.data()) != LUMRA_SUCCESS)
      return "status code " + std::to_string(code_);
    text.resize(static_cast<std::size_t>(length));
    return text;
  }

  friend constexpr bool operator==(status, status) noexcept = default;

 private:
  std::int32_t code_ = LUMRA_SUCCESS;
};

class error : public std::runtime_error {
 public:
  explicit error(lumra::status status) : std::runtime_error(status.message()), status_(status) {}
  [[nodiscard]] lumra::status status() const noexcept { return status_; }

 private:
  lumra::status status_;
};

/// Throws lumra::error for a negative code.
inline void check(std::int32_t code) {
  if (code < 0) throw error(status(code));
}

/// Which library this is.
struct library_info {
  std::string name;
  std::uint32_t version = 0;  // major in the top byte, minor in the next
  std::string version_text;   // "20.6.0f0"
  std::string description;
  bool uses_avx = false;  // the kernels in use, by what processor and operating system support
};

[[nodiscard]] inline library_info library() {
  library_info info;
  std::array<char, 64> name{}, version{}, description{};
  std::uint8_t avx = 0;
  check(qsLumraAlgo_getLibraryFilename(name.data(), name.size()));
  check(qsLumraAlgo_getLibraryInfo(&info.version, version.data(), version.size(), description.data(),
                                   description.size()));
  check(qsLumraAlgo_hasAvxHardwareSupport(&avx));
  info.name = name.data();
  info.version_text = version.data();
  info.description = description.data();
  info.uses_avx = avx != 0;
  return info;
}

namespace detail {
template <class T>
struct element;
template <>
struct element<float> {
  using block = lumra_f32_block;
  using matrix_block = lumra_f32_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_F32;
};
template <>
struct element<double> {
  using block = lumra_f64_block;
  using matrix_block = lumra_f64_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_F64;
};
template <>
struct element<std::complex<float>> {
  using block = lumra_cf32_block;
  using matrix_block = lumra_cf32_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_CF32;
};
template <>
struct element<std::complex<double>> {
  using block = lumra_cf64_block;
  using matrix_block = lumra_cf64_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_CF64;
};
}  // namespace detail

/// An owned vector in the library's own memory; T is float, double or std::complex of one of them.
template <class T>
class host_array {
 public:
  using handle = typename detail::element<T>::block **;

  host_array() = default;
  explicit host_array(std::size_t count) {
    const std::int32_t size = checked(count);
    check(qsHost_ArrayNew(detail::element<T>::code, 1, &size, &handle_));
  }
  host_array(host_array &&other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
  host_array &operator=(host_array &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~host_array() { qsHost_ArrayFree(&handle_); }

  /// The elements; valid until the array is resized, by a call that writes it too.
  [[nodiscard]] std::span<T> elements() noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<const T> elements() const noexcept { return {data(), size()}; }
  [[nodiscard]] std::size_t size() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->count) : 0;
  }

  /// Keeps the elements up to the smaller of the two counts; new ones are zero.
  void resize(std::size_t count) {
    const std::int32_t wanted = checked(count);
    const std::size_t before = size();
    check(qsHost_ArrayResize(detail::element<T>::code, 1, &handle_, count));
    (*handle_)->count = wanted;
    for (T &fresh : elements().subspan(before < count ? before : count)) fresh = T{};
  }

  /// The handle that C functions take; `address` where they may make a new one.
  [[nodiscard]] handle get() const noexcept { return handle_; }
  [[nodiscard]] handle *address() noexcept { return &handle_; }
  [[nodiscard]] handle release() noexcept { return std::exchange(handle_, nullptr); }

 private:
  static std::int32_t checked(std::size_t count) {
    if (count > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
      throw std::length_error("host_array");
    return static_cast<std::int32_t>(count);
  }
  [[nodiscard]] bool has_block() const noexcept { return handle_ && *handle_; }
  [[nodiscard]] T *data() const noexcept { return has_block() ? reinterpret_cast<T *>((*handle_)->elements) : nullptr; }

  handle handle_ = nullptr;
};

/// An owned matrix in the library's own memory, row by row; T as for host_array.
template <class T>
class host_matrix {
 public:
  using handle = typename detail::element<T>::matrix_block **;

  host_matrix() = default;
  host_matrix(std::size_t rows, std::size_t columns) { resize(rows, columns); }
  host_matrix(host_matrix &&other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
  host_matrix &operator=(host_matrix &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~host_matrix() { qsHost_ArrayFree(&handle_); }

  /// The elements, row after row; valid until the matrix is resized.
  [[nodiscard]] std::span<T> elements() noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<const T> elements() const noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<T> row(std::size_t r) noexcept { return elements().subspan(r * columns(), columns()); }
  [[nodiscard]] std::size_t rows() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->rows) : 0;
  }
  [[nodiscard]] std::size_t columns() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->columns) : 0;
  }
  [[nodiscard]] std::size_t size() const noexcept { return rows() * columns(); }

  /// The first elements, row after row, stay the first ones whatever the new rows are; new ones are zero.
  void resize(std::size_t rows, std::size_t columns) {
    constexpr auto most = static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max());
    if (rows > most || columns > most || (columns > 0 && rows > most / columns)) throw std::length_error("host_matrix");
    const std::size_t before = size();
    const std::size_t count = rows * columns;
    check(qsHost_ArrayResize(detail::element<T>::code, 2, &handle_, count));
    (*handle_)->rows = static_cast<std::int32_t>(rows);
    (*handle_)->columns = static_cast<std::int32_t>(columns);
    for (T &fresh : elements().subspan(before < count ? before : count)) fresh = T{};
  }

  /// The handle that C functions take.
  [[nodiscard]] handle get() const noexcept { return handle_; }

 private:
  [[nodiscard]] bool has_block() const noexcept { return handle_ && *handle_; }
  [[nodiscard]] T *data() const noexcept { return has_block() ? reinterpret_cast<T *>((*handle_)->elements) : nullptr; }

  handle handle_ = nullptr;
};

enum class window : std::int32_t { none = LUMRA_WINDOW_NONE, flat_top = LUMRA_WINDOW_FLAT_TOP };

/// A power spectrum; bin k lies at f0 + k * df.
struct spectrum {
  double f0 = 0;
  double df = 0;
  host_array<float> power;
};

/// An owned session. Its functions may be called from several threads at once.
class session {
 public:
  session() { check(qsLumraAlgo_CreateSession(&handle_)); }
  session(session &&other) noexcept : handle_(std::exchange(other.handle_, 0)) {}
  session &operator=(session &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~session() { qsLumraAlgo_CloseSession(handle_); }

  void initialize_fft(std::int32_t fft_size) { check(qsLumraAlgo_InitializeFFT(handle_, fft_size)); }
  void initialize_window(window type, std::int32_t fft_size) {
    check(qsLumraAlgo_InitializeWindow(handle_, static_cast<std::uint32_t>(type), fft_size));
  }
  void reset() { check(qsLumraAlgo_ResetSession(handle_)); }

  /// Averaged power spectrum of samples taken every dt seconds; the window must have been initialised for fft_size.
  void power_spectrum(window type, std::int32_t fft_size, double overlap_percent,
                      const host_array<std::complex<float>> &samples, double dt, spectrum &out) {
    const lumra_waveform waveform{0.0, dt, samples.get()};
    lumra_spectrum result{0.0, 0.0, out.power.get()};
    const std::int32_t code = qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(
        handle_, static_cast<std::int32_t>(type), fft_size, overlap_percent, &waveform, &result);
    *out.power.address() = result.y;
    check(code);
    out.f0 = result.f0;
    out.df = result.df;
  }

  /// The oldest entry of the log; waits for one.
  [[nodiscard]] std::string read_log() {
    std::array<char, 1024> text{};
    check(qsLumraAlgo_ReadLog(handle_, 0.0, text.data(), text.size()));
    return text.data();
  }

  [[nodiscard]] std::uint64_t get() const noexcept { return handle_; }

 private:
  std::uint64_t handle_ = 0;
};

// Vector utilities, as their C functions document them. Outputs are sized by the call.

namespace detail {
/// Throws where a resize was refused, which the C functions do not report.
template <class T>
void sized(const host_array<T> &out, std::size_t count) {
  if (out.size() != count) throw std::bad_alloc();
}
}  // namespace detail

/// out[i] = x[i] / y[i].
inline void divide(const host_array<std::complex<float>> &x, const host_array<std::complex<float>> &y,
                   host_array<std::complex<float>> &out) {
  check(qsRFHS_complex_division_array_by_array(x.get(), y.get(), out.address()));
  detail::sized(out, x.size());
}

/// out[i] = x[i] / v.
inline void divide(const host_array<std::complex<float>> &x, std::complex<float> v,
                   host_array<std::complex<float>> &out) {
  const lumra_cf32 value{v.real(), v.imag()};
  check(qsRFHS_complex_division_array_by_value(x.get(), &value, out.address()));
  detail::sized(out, x.size());
}

inline void magnitude(const host_array<std::complex<float>> &x, host_array<float> &out) {
  check(qsRFHS_complex_magnitude(x.get(), out.address()));
  detail::sized(out, x.size());
}

inline void magnitude_squared(const host_array<std::complex<float>> &x, host_array<float> &out) {
  check(qsRFHS_complex_magnitude_squared(x.get(), out.address()));
  detail::sized(out, x.size());
}

/// out[i] = c[0] + c[1] x[i] + c[2] x[i]^2 ...; with more than 16 real coefficients only part of it, see
/// qsRFHS_ApplyPolynomial.
template <class T>
void polynomial(const host_array<float> &x, const host_array<T> &c, host_array<T> &out) {
  if (!out.get()) out = host_array<T>(0);
  if constexpr (std::is_same_v<T, float>)
    check(qsRFHS_ApplyPolynomial(x.get(), c.get(), out.get()));
  else
    check(qsRFHS_ApplyPolynomialCplx(x.get(), c.get(), out.get(), nullptr));
  detail::sized(out, c.size() == 0 ? 0 : x.size());
}

/// out[i] = a * log2(x[i]) + b, of |x[i]|^2 where x is complex.
template <class T>
void scaled_log2(const host_array<T> &x, host_array<float> &out, float a, float b) {
  if constexpr (std::is_same_v<T, float>)
    check(qsUtilHS_aLog2Plusb_SGL(x.get(), out.address(), a, b));
  else
    check(qsUtilHS_aLog2Plusb_IQ(x.get(), out.address(), a, b));
  detail::sized(out, x.size());
}

struct level {
  float rms;
  float peak;
};

/// NaN for no samples.
[[nodiscard]] inline float rms(const host_array<std::complex<float>> &x) {
  float result = 0;
  check(qsUtilHS_RMS_IQ(x.get(), &result));
  return result;
}

[[nodiscard]] inline level rms_and_peak(const host_array<std::complex<float>> &x) {
  level result{};
  check(qsUtilHS_RMS_IQ_with_peak_calc(x.get(), &result.rms, &result.peak));
  return result;
}

/// out[i] = in[i] * (gain at keys[i]); the table holds a value and a slope for each entry.
inline void lookup(const host_array<float> &keys, const host_array<std::complex<float>> &in,
                   host_array<std::complex<float>> &out, const host_array<std::complex<float>> &table, float start,
                   float step) {
  if (in.size() < keys.size()) throw std::length_error("lookup");
  check(qsUtilHS_LookupTable(keys.get(), in.get(), out.address(), table.get(), start, step));
  detail::sized(out, keys.size());
}

/// Multiplies by a real factor, in place.
inline void scale(std::span<std::complex<float>> x, float factor) {
  check(qsLumraAlgo_scale_cf(reinterpret_cast<lumra_cf32 *>(x.data()), x.size(), factor));
}

namespace detail {
/// An owner identifier that nobody else has: releasing it releases what was made under it, and nothing else.
class private_owner {
 public:
  [[nodiscard]] std::uint64_t get() const noexcept {
    return static_cast<std::uint64_t>(reinterpret_cast<std::uintptr_t>(address_.get()));
  }

 private:
  std::unique_ptr<char> address_ = std::make_unique<char>();
};
}  // namespace detail

/// An owned array that stays inside the library; one thread's at a time.
class stored_array {
 public:
  stored_array() = default;
  /// `count` elements of undefined value.
  explicit stored_array(std::size_t count) {
    if (count > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
      throw std::length_error("stored_array");
    lumra_array_ref *reference = &reference_;
    check(qsUtilHS_AllocateArray_CSG(&reference, static_cast<std::int32_t>(count), owner()));
  }
  stored_array(stored_array &&other) noexcept { swap(other); }
  stored_array &operator=(stored_array &&other) noexcept {
    swap(other);
    return *this;
  }
  ~stored_array() {
    lumra_array_ref *reference = &reference_;
    qsUtilHS_FreeArray_CSG(&reference);
  }

  [[nodiscard]] std::size_t size() const noexcept { return reference_.block ? reference_.block->count : 0; }
  [[nodiscard]] std::span<std::complex<float>> elements() noexcept {
    if (!reference_.block) return {};
    return {reinterpret_cast<std::complex<float> *>(reference_.block->data), size()};
  }

  /// Elements offset to offset + count - 1; zeros where the array has none.
  void read(host_array<std::complex<float>> &out, std::int32_t offset, std::size_t count) const {
    if (count > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
      throw std::length_error("stored_array");
    lumra_array_ref copy = reference_, *reference = &copy;
    check(qsUtilHS_ReadArray_CSG(&reference, out.address(), offset, static_cast<std::int32_t>(count)));
  }

 private:
  void swap(stored_array &other) noexcept {
    const lumra_array_ref mine = reference_;
    reference_ = other.reference_;
    other.reference_ = mine;
  }
  /// All under one owner that is never released: each array releases itself.
  static std::uint64_t owner() {
    static const detail::private_owner arrays;
    return arrays.get();
  }

  lumra_array_ref reference_{1, nullptr};
};

/// A reference to a registered filter. The coefficients are valid while it, or another to the same filter, exists.
class registered_filter {
 public:
  /// The filter of a key; `count` coefficients, or as many as the key says for 0, where it is to be designed.
  explicit registered_filter(const lumra_filter_key &key, std::uint64_t count = 0) {
    check(qsUtilHS_RegisterFilterSpec(&record_, nullptr, &key, count));
  }
  /// Frequencies in hertz, attenuation in decibels.
  static registered_filter kaiser_low_pass(double sample_rate, double pass_edge, double stop_edge, double attenuation) {
    return registered_filter({LUMRA_FILTER_KAISER_LOW_PASS, {}, {sample_rate, pass_edge, stop_edge, attenuation}});
  }
  /// Rates in hertz, span in symbols.
  static registered_filter root_raised_cosine(double sample_rate, double symbol_rate, double roll_off, double span) {
    return registered_filter({LUMRA_FILTER_ROOT_RAISED_COSINE, {}, {sample_rate, symbol_rate, roll_off, span}});
  }
  /// These coefficients, or those that were given for the same values before.
  registered_filter(const host_array<float> &coefficients, const std::array<double, 4> &values) {
    const lumra_filter_key key{LUMRA_FILTER_GIVEN, {}, {values[0], values[1], values[2], values[3]}};
    check(qsUtilHS_RegisterFilterSpec(&record_, coefficients.get(), &key, 0));
  }
  /// The filter of a key, where it is registered.
  static std::optional<registered_filter> find(const lumra_filter_key &key) {
    registered_filter found;
    if (qsUtilHS_MatchFilterSpecErase(&found.record_, &key, 0) != LUMRA_SUCCESS) return std::nullopt;
    return found;
  }
  /// Nobody finds the filter any more; references to it stay good. False where there is none.
  static bool erase(const lumra_filter_key &key) {
    constexpr std::int32_t erased = -50462794;
    lumra_filter_record unused{};
    return qsUtilHS_MatchFilterSpecErase(&unused, &key, 1) == erased;
  }
  registered_filter(registered_filter &&other) noexcept : record_(std::exchange(other.record_, {})) {}
  registered_filter &operator=(registered_filter &&other) noexcept {
    std::swap(record_, other.record_);
    return *this;
  }
  ~registered_filter() {
    if (record_.entry) qsUtilHS_UnegisterFilterSpec(&record_);
  }

  [[nodiscard]] std::span<const float> coefficients() const noexcept {
    if (!record_.entry) return {};
    return {record_.entry->coefficients, static_cast<std::size_t>(record_.entry->n)};
  }
  [[nodiscard]] std::uint64_t identifier() const noexcept { return record_.identifier; }

 private:
  registered_filter() = default;

  lumra_filter_record record_{};
};

/// What became of a transfer through a FIFO.
enum class transfer { done, timed_out, closed };

namespace detail {
/// One FIFO under a name; closed when the last of its ends goes.
class fifo {
 public:
  fifo(const char *name, std::uint32_t capacity) : handle_(qsLTEHS_DataFIFOCreate(name, capacity, 0, &cell_)) {
    if (handle_ != 0) return;
    qsLTEHS_DataFIFOUnreserve(&cell_);
    throw std::runtime_error("no FIFO: sixteen exist, or memory is out");
  }
  fifo(const fifo &) = delete;
  fifo &operator=(const fifo &) = delete;
  ~fifo() { qsLTEHS_DataFIFOUnreserve(&cell_); }

  transfer move(std::int32_t direction, const void *source, void *destination, std::size_t bytes) const {
    if (bytes > capacity() && !closed()) throw std::length_error("more than the FIFO can hold");
    const auto count = static_cast<std::uint32_t>(bytes);
    const std::int32_t moved = qsLTEHS_DataFIFO(handle_, direction, source, destination, 0, count);
    return moved >= 0 ? transfer::done : moved == -1 ? transfer::timed_out : transfer::closed;
  }
  [[nodiscard]] std::uint32_t capacity() const noexcept { return status().first; }
  [[nodiscard]] std::uint32_t fill() const noexcept { return status().second; }
  [[nodiscard]] bool closed() const noexcept { return qsLTEHS_DataFIFO_GetStatus(handle_, nullptr, nullptr) != 0; }
  void flush() const noexcept { qsLTEHS_DataFIFO_Flush(handle_); }
  void close() const noexcept { qsLTEHS_DataFIFODelete(handle_); }

 private:
  [[nodiscard]] std::pair<std::uint32_t, std::uint32_t> status() const noexcept {
    std::pair<std::uint32_t, std::uint32_t> held;
    qsLTEHS_DataFIFO_GetStatus(handle_, &held.first, &held.second);
    return held;
  }

  std::uint64_t *cell_ = nullptr;
  std::uint64_t handle_;
};
}  // namespace detail

/// What both ends of a FIFO have. An end belongs to one thread and cannot be copied, so that there is one writer and
/// one reader. An end that was moved from is not to be used.
class fifo_end {
 public:
  fifo_end(fifo_end &&) noexcept = default;
  fifo_end &operator=(fifo_end &&) noexcept = default;

  [[nodiscard]] std::uint32_t capacity() const noexcept { return fifo_->capacity(); }
  [[nodiscard]] std::uint32_t fill() const noexcept { return fifo_->fill(); }
  void flush() noexcept { fifo_->flush(); }
  /// Lets the other end go, too: its transfers give transfer::closed from now on.
  void close() noexcept { fifo_->close(); }

 protected:
  explicit fifo_end(std::shared_ptr<const detail::fifo> fifo) noexcept : fifo_(std::move(fifo)) {}
  ~fifo_end() = default;

  std::shared_ptr<const detail::fifo> fifo_;
};

class fifo_writer : public fifo_end {
 public:
  /// All the bytes or none; waits up to 100 ms for room. More than the capacity is refused with std::length_error.
  transfer write(std::span<const std::byte> bytes) {
    return fifo_->move(LUMRA_FIFO_WRITE, bytes.data(), nullptr, bytes.size());
  }

 private:
  using fifo_end::fifo_end;
  friend struct fifo_ends;
};

class fifo_reader : public fifo_end {
 public:
  /// As many bytes as asked for, or none; waits up to 100 ms for them.
  transfer read(std::span<std::byte> bytes) {
    return fifo_->move(LUMRA_FIFO_READ, nullptr, bytes.data(), bytes.size());
  }

 private:
  using fifo_end::fifo_end;
  friend struct fifo_ends;
};

/// A new FIFO's two ends. It closes when both are gone, or when a FIFO of the same name replaces it.
struct fifo_ends {
  fifo_ends(const std::string &name, std::uint32_t capacity)
      : fifo_ends(std::make_shared<const detail::fifo>(name.c_str(), capacity)) {}

  fifo_writer writer;
  fifo_reader reader;

 private:
  explicit fifo_ends(const std::shared_ptr<const detail::fifo> &fifo) : writer(fifo), reader(fifo) {}
};

/// An owned descriptor of the FFT resampler; one thread's at a time. It waits for the next of its kind afterwards.
class resampler_descriptor {
 public:
  enum class direction : std::uint32_t { forward = 0, inverse = 1 };

  /// With a work buffer for the inverse direction.
  resampler_descriptor(std::uint32_t length, direction to) {
    const auto flag = static_cast<std::uint32_t>(to);
    check(qsUtilHS_FFTResampler_CSG_CreateDescriptor(&descriptor_, length, flag, flag, owner_.get()));
  }
  resampler_descriptor(resampler_descriptor &&other) noexcept
      : owner_(std::move(other.owner_)), descriptor_(std::exchange(other.descriptor_, nullptr)) {}
  resampler_descriptor &operator=(resampler_descriptor &&other) noexcept {
    std::swap(owner_, other.owner_);
    std::swap(descriptor_, other.descriptor_);
    return *this;
  }
  ~resampler_descriptor() {
    if (descriptor_) qsUtilHS_FreeArrayIDH_CSG(owner_.get());
  }

  [[nodiscard]] lumra_resampler_descriptor *get() const noexcept { return descriptor_; }

 private:
  detail::private_owner owner_;
  lumra_resampler_descriptor *descriptor_ = nullptr;
};

// The typed toolkit over spans. T is float, double or std::complex of one of them; the export is chosen by it.

enum class part : std::int32_t { full = 0, same = 1, valid = 2 };
enum class method : std::int32_t { direct = 0, fourier = 1 };
enum class normalisation : std::int32_t { none = 0, unbiased = 1, biased = 2 };
enum class shift : std::int32_t { none = 0, centred = 1 };

/// Sum-of-cosines windows of apply_window.
enum class cosine_window : std::int32_t {
  rectangular = 0,
  hann = 1,
  hamming = 2,
  blackman_harris_3 = 3,
  exact_blackman = 4,
  blackman = 5,
  flat_top = 6,
  blackman_harris_4 = 7,
  blackman_harris_7 = 8,
  low_sidelobe = 9,
  blackman_nuttall = 11,
};

namespace detail {
template <class T>
struct parts {
  using real = T;
  using complex = std::complex<T>;
};
template <class T>
struct parts<std::complex<T>> {
  using real = T;
  using complex = std::complex<T>;
};
template <class T>
using real_of = typename parts<T>::real;
template <class T>
using complex_of = typename parts<T>::complex;
template <class T, class U>
using common_of = std::conditional_t<std::is_floating_point_v<T>, U, T>;

template <class T>
inline constexpr int letter = std::is_same_v<T, float>    ? 0
                              : std::is_same_v<T, double> ? 1
                              : sizeof(T) == 8            ? 2
                                                          : 3;

/// The one of four exports that has T's letter: s, d, c, z.
template <class T, class S, class D, class C, class Z>
constexpr auto choose(S s, D d, C c, Z z) noexcept {
  if constexpr (letter<T> == 0)
    return s;
  else if constexpr (letter<T> == 1)
    return d;
  else if constexpr (letter<T> == 2)
    return c;
  else
    return z;
}
}  // namespace detail

/// What the toolkit keeps between calls: work arrays and the latest transform. Calls of equal lengths and types with
/// one plan make no new transform and, once the arrays have grown, no new memory. One thread at a time.
template <class T>
class plan {
 public:
  plan() = default;
  plan(plan &&other) noexcept
      : x(std::move(other.x)),
        y(std::move(other.y)),
        out(std::move(other.out)),
        bins(std::move(other.bins)),
        magnitudes(std::move(other.magnitudes)),
        scratch(std::move(other.scratch)),
        transform_scratch(std::move(other.transform_scratch)),
        bins_scratch(std::move(other.bins_scratch)),
        tables(std::move(other.tables)),
        slot_(std::exchange(other.slot_, nullptr)) {}
  plan &operator=(plan &&) = delete;
  ~plan() { qsHost_ReleaseTransform(&slot_); }

  [[nodiscard]] void **slot() noexcept { return &slot_; }

  // Results of the functions below lie in out, bins and magnitudes until the next call with the plan.
  host_array<T> x{0}, y{0}, out{0};
  host_array<detail::complex_of<T>> bins{0};
  host_array<detail::real_of<T>> magnitudes{0};
  host_array<T> scratch{0}, transform_scratch{0};
  host_array<detail::complex_of<T>> bins_scratch{0};
  host_array<double> tables{0};

 private:
  void *slot_ = nullptr;
};

namespace detail {
template <class T>
void load(host_array<T> &to, std::type_identity_t<std::span<const T>> from) {
  to.resize(from.size());
  std::copy(from.begin(), from.end(), to.elements().begin());
}
}  // namespace detail

/// Bins of the discrete Fourier transform of size points (0: as many as samples).
template <class T>
std::span<const detail::complex_of<T>> fft(plan<T> &plan, std::type_identity_t<std::span<const T>> samples,
                                           std::int32_t size = 0, shift order = shift::none) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_s1DFFTH, &qsRFPELTA_d1DFFTH, &qsRFPELTA_c1DFFTH, &qsRFPELTA_z1DFFTH);
  detail::load(plan.x, samples);
  check(run(plan.x.get(), plan.bins.get(), size, static_cast<std::int32_t>(order), plan.scratch.get(), plan.slot()));
  return plan.bins.elements();
}

/// The record, of type T, that has these bins.
template <class T>
std::span<const T> inverse_fft(plan<T> &plan, std::type_identity_t<std::span<const detail::complex_of<T>>> spectrum,
                               shift order = shift::none) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_s1DInvFFTH, &qsRFPELTA_d1DInvFFTH, &qsRFPELTA_c1DInvFFTH, &qsRFPELTA_z1DInvFFTH);
  // A spectrum that the plan itself holds needs no copy.
  if (spectrum.data() != plan.bins.elements().data() || spectrum.size() != plan.bins.size())
    detail::load(plan.bins, spectrum);
  check(run(plan.bins.get(), plan.out.get(), static_cast<std::int32_t>(order), plan.bins_scratch.get(), plan.slot()));
  return plan.out.elements();
}

template <class T>
std::span<const T> convolve(plan<T> &plan, std::type_identity_t<std::span<const T>> x,
                            std::type_identity_t<std::span<const T>> y, part kept = part::full,
                            method how = method::fourier, std::int32_t block_size = 0) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_s1DConvolutionH, &qsRFPELTA_d1DConvolutionH,
                                         &qsRFPELTA_c1DConvolutionH, &qsRFPELTA_z1DConvolutionH);
  detail::load(plan.x, x);
  detail::load(plan.y, y);
  check(run(plan.x.get(), plan.y.get(), plan.out.get(), static_cast<std::int32_t>(kept), static_cast<std::int32_t>(how),
            block_size, plan.scratch.get(), plan.transform_scratch.get(), plan.slot()));
  return plan.out.elements();
}

/// Cross-correlation; the plan has the type of the lags. One of the two records may be real where the lags are complex.
template <class T, class X, class Y>
std::span<const T> correlate(plan<T> &plan, std::span<X> x, std::span<Y> y, normalisation norm = normalisation::none,
                             method how = method::fourier, std::int32_t block_size = 0) {
  using first = std::remove_const_t<X>;
  using second = std::remove_const_t<Y>;
  static_assert(std::is_same_v<T, detail::common_of<first, second>>, "the plan must have the type of the lags");
  host_array<first> real_x(0);
  host_array<second> real_y(0);
  const auto call = [&](auto run, auto &from_x, auto &from_y) {
    detail::load(from_x, x);
    detail::load(from_y, y);
    check(run(from_x.get(), from_y.get(), plan.out.get(), static_cast<std::int32_t>(how),
              static_cast<std::int32_t>(norm), block_size, plan.scratch.get(), plan.transform_scratch.get(),
              plan.slot()));
  };
  if constexpr (std::is_same_v<first, second>) {
    call(detail::choose<T>(&qsRFPELTA_s1DCorrelationH, &qsRFPELTA_d1DCorrelationH, &qsRFPELTA_c1DCorrelationH,
                           &qsRFPELTA_z1DCorrelationH),
         plan.x, plan.y);
  } else if constexpr (std::is_floating_point_v<first>) {
    static_assert(std::is_same_v<std::complex<first>, second>, "one precision");
    call(detail::choose<T>(0, 0, &qsRFPELTA_sc1DCorrelationH, &qsRFPELTA_dz1DCorrelationH), real_x, plan.y);
  } else {
    static_assert(std::is_same_v<first, std::complex<second>>, "one precision");
    call(detail::choose<T>(0, 0, &qsRFPELTA_cs1DCorrelationH, &qsRFPELTA_zd1DCorrelationH), plan.x, real_y);
  }
  return plan.out.elements();
}

/// |X[k]|^2 / N^2, bin 0 first.
template <class T>
std::span<const detail::real_of<T>> power_spectrum(plan<T> &plan, std::type_identity_t<std::span<const T>> samples) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sPowerSpectrumH, &qsRFPELTA_dPowerSpectrumH,
                                         &qsRFPELTA_cPowerSpectrumH, &qsRFPELTA_zPowerSpectrumH);
  detail::load(plan.x, samples);
  check(run(plan.x.get(), plan.magnitudes.get(), plan.scratch.get(), plan.slot()));
  return plan.magnitudes.elements();
}

/// The samples times a window; with `normalised` its first coefficient is 1.
template <class T>
std::span<const T> apply_window(plan<T> &plan, std::type_identity_t<std::span<const T>> samples, cosine_window type,
                                bool normalised = false) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_sAllCosWinH, &qsRFPELTA_dAllCosWinH, &qsRFPELTA_cAllCosWinH, &qsRFPELTA_zAllCosWinH);
  detail::load(plan.out, samples);
  check(run(plan.out.get(), static_cast<std::int32_t>(type), normalised, plan.tables.get()));
  return plan.out.elements();
}

// Error vectors, as their C functions document them: b is compared with the reference a. The matrices must agree in the
// number of elements; e is not resized.

enum class accuracy : std::int32_t {
  low = LUMRA_ACCURACY_LOW,
  high = LUMRA_ACCURACY_HIGH,
  enhanced_performance = LUMRA_ACCURACY_ENHANCED_PERFORMANCE
};

/// e[i] = |b[i] - a[i]|.
inline void error_magnitude(const host_matrix<std::complex<float>> &a, const host_matrix<std::complex<float>> &b,
                            host_matrix<float> &e, accuracy mode = accuracy::high) {
  check(qsLumraAlgo_CalculateEVM2D(a.get(), b.get(), e.get(), static_cast<std::int32_t>(mode)));
}

/// e[i] = |b[i]| - |a[i]|.
inline void magnitude_error(const host_matrix<std::complex<float>> &a, const host_matrix<std::complex<float>> &b,
                            host_matrix<float> &e, accuracy mode = accuracy::high) {
  check(qsLumraAlgo_CalculateMagnitudeError2D(a.get(), b.get(), e.get(), static_cast<std::int32_t>(mode)));
}

/// e[i] = arg(b[i] * conj(a[i])) in radians.
inline void phase_error(const host_matrix<std::complex<float>> &a, const host_matrix<std::complex<float>> &b,
                        host_matrix<float> &e, accuracy mode = accuracy::high) {
  check(qsLumraAlgo_CalculatePhaseError2D(a.get(), b.get(), e.get(), static_cast<std::int32_t>(mode)));
}

enum class interpolation : std::int32_t { linear = 0, nearest = 1 };

/// A stream of T at another rate. One thread at a time.
template <class T>
class resampler {
 public:
  struct settings {
    float ratio = 1;  // input samples per output sample
    float delay = 0;  // of the first output, in input samples
    lumra::interpolation interpolation = lumra::interpolation::linear;
    bool bandwidth_scaling = true;
  };

  /// `prototype` has `phases` coefficients per input sample.
  resampler(std::type_identity_t<std::span<const detail::real_of<T>>> prototype, std::int32_t phases,
            const settings &how)
      : phases_(phases), how_(how) {
    prototype_.resize(prototype.size());
    std::copy(prototype.begin(), prototype.end(), prototype_.elements().begin());
  }

  /// The outputs that the next block of the stream gives; good until the next call.
  std::span<const T> operator()(std::type_identity_t<std::span<const T>> block) {
    constexpr auto run = detail::choose<T>(&qsRFPELTA_sResampleC2CH, &qsRFPELTA_dResampleC2CH, &qsRFPELTA_cResampleC2CH,
                                           &qsRFPELTA_zResampleC2CH);
    detail::load(in_, block);
    const lumra_resampler_parameters parameters{how_.ratio, how_.delay, static_cast<std::int32_t>(how_.interpolation)};
    const bool reset = std::exchange(reset_, true);  // again after a failure
    check(run(in_.get(), prototype_.get(), phases_, &parameters, reset, how_.bandwidth_scaling, out_.get(), &time_,
              samples_.get(), taps_.get(), state_.data()));
    reset_ = false;
    return out_.elements();
  }
  /// Position of the latest block's first output, in input samples since the beginning.
  [[nodiscard]] float first_output_time() const noexcept { return time_; }
  /// The next block begins a new stream.
  void reset() noexcept { reset_ = true; }

 private:
  std::int32_t phases_;
  settings how_;
  bool reset_ = true;
  float time_ = 0;
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE> state_{};
  host_array<detail::real_of<T>> prototype_{0}, taps_{0};
  host_array<T> in_{0}, out_{0}, samples_{0};
};

/// A direct-form filter with its memory: coefficients b over a. One thread at a time.
template <class T>
class iir_filter {
 public:
  using coefficients = std::type_identity_t<std::span<const detail::real_of<T>>>;

  iir_filter(coefficients b, coefficients a) {
    forward_.resize(b.size());
    reverse_.resize(a.size());
    std::copy(b.begin(), b.end(), forward_.elements().begin());
    std::copy(a.begin(), a.end(), reverse_.elements().begin());
  }

  /// The next block of the stream, filtered; good until the next call.
  std::span<const T> operator()(std::type_identity_t<std::span<const T>> block) {
    detail::load(data_, block);
    const std::int32_t reset = std::exchange(reset_, false);
    constexpr auto run = detail::choose<T>(&qsRFPELTA_ssIIRDirectFilterH, &qsRFPELTA_ddIIRDirectFilterH,
                                           &qsRFPELTA_csIIRDirectFilterH, &qsRFPELTA_zdIIRDirectFilterH);
    if constexpr (std::is_same_v<T, std::complex<double>>)
      check(run(data_.get(), reverse_.get(), forward_.get(), inputs_.get(), outputs_.get(), reset,
                forward_scratch_.get(), saved_.get()));
    else
      check(run(data_.get(), reverse_.get(), forward_.get(), inputs_.get(), outputs_.get(), reset,
                forward_scratch_.get(), reverse_scratch_.get(), saved_.get()));
    return data_.elements();
  }
  /// The next block begins a new stream.
  void reset() noexcept { reset_ = true; }

 private:
  bool reset_ = true;
  host_array<detail::real_of<T>> forward_{0}, reverse_{0}, forward_scratch_{0}, reverse_scratch_{0};
  host_array<T> data_{0}, inputs_{0}, outputs_{0}, saved_{0};
};

/// Every `factor`-th sample, or the means of `factor` samples.
template <class T>
host_array<T> decimate(const host_array<T> &samples, std::int32_t factor, bool average) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_sDecimateH, &qsRFPELTA_dDecimateH, &qsRFPELTA_cDecimateH, &qsRFPELTA_zDecimateH);
  host_array<T> out(0);
  check(run(samples.get(), out.get(), factor, average));
  return out;
}

template <class T>
detail::real_of<T> rms(const host_array<T> &samples) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sRMSH, &qsRFPELTA_dRMSH, &qsRFPELTA_cRMSH, &qsRFPELTA_zRMSH);
  detail::real_of<T> result = 0;
  check(run(samples.get(), &result));
  return result;
}

enum class fit_method : std::int32_t { least_squares = 0, least_absolute = 1, bisquare = 2 };

template <class T>
struct fitted_line {
  T slope = 0, intercept = 0, residue = 0;
  std::int32_t iterations = 0;
};

/// Replaces y by the line's values. No weights: all points count alike.
template <class T>
fitted_line<T> linear_fit(host_array<T> &y, const host_array<T> &x, const host_array<T> &weights = host_array<T>(0),
                          fit_method method = fit_method::least_squares, float tolerance = 0, float iterations = 0) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sLinearFitH, &qsRFPELTA_dLinearFitH, 0, 0);
  host_array<T> scratch(0);
  fitted_line<T> line;
  check(run(y.get(), x.get(), weights.get(), &line.slope, &line.intercept, &line.residue,
            static_cast<std::int32_t>(method), tolerance, iterations, &line.iterations, scratch.get()));
  return line;
}

/// T is float or std::complex<float>, here and below.
template <class T>
host_matrix<T> multiply(const host_matrix<T> &a, const host_matrix<T> &b) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sMtrxMulH, 0, &qsRFPELTA_cMtrxMulH, 0);
  host_matrix<T> product(0, 0);
  check(run(a.get(), b.get(), product.get()));
  return product;
}

template <class T>
host_array<T> multiply(const host_matrix<T> &a, const host_array<T> &x) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sMtrxVecMulH, 0, &qsRFPELTA_cMtrxVecMulH, 0);
  host_array<T> product(0);
  check(run(a.get(), x.get(), product.get()));
  return product;
}

/// The shortest x that makes |a x - b| smallest; singular values up to `tolerance` times the largest count as zero.
template <class T>
host_array<T> least_squares(const host_matrix<T> &a, const host_array<T> &b, float tolerance = 0) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sLSEqH, 0, &qsRFPELTA_cLSEqH, 0);
  host_array<T> x(0), matrix(0), rhs(0), work(0);
  check(run(a.get(), b.get(), tolerance, x.get(), matrix.get(), rhs.get(), work.get()));
  return x;
}

}  // namespace lumra
