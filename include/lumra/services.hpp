// Arrays that stay inside the library, registered filters, FIFOs, descriptors of the FFT resampler.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/core_services.h>
#include <lumra/host_array.hpp>

#include <array>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <utility>

namespace lumra {

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

}  // namespace lumra
