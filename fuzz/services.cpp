// The core services, followed by models of what they hold: array store, FIFOs, filters, transforms of the resampler,
// list of failures, host arrays. SPDX-License-Identifier: MIT
#include <lumra/core_services.h>

#include <cmath>
#include <map>
#include <string>

#include "host_arrays.hpp"

namespace fuzz {
namespace {

/// Arrays of the library by owner; references may be stale, forged, or of no kind.
class store {
 public:
  store() { std::fill(std::begin(refs_), std::end(refs_), lumra_array_ref{1, nullptr}); }
  store(const store &) = delete;
  store &operator=(const store &) = delete;
  ~store() {
    for (std::uint64_t owner = 0; owner < owners; ++owner) release(owner);
  }

  void step(input &in, call &on) {
    lumra_array_ref &ref = refs_[in.choice(4)], *place = in.one_in(16) ? nullptr : &ref;
    if (in.one_in(32)) ref.block = in.flag() ? refs_[0].block : in.raw<lumra_array_block *>();
    if (in.one_in(16)) ref.kind = static_cast<std::int32_t>(in.choice(3));
    lumra_array_ref **const array = in.one_in(16) ? nullptr : &place;
    const bool valid = array && place && ref.kind == 1;
    lumra_array_block *const block = ref.block;  // references are packed
    const auto found = live_.find(block);
    switch (in.choice(5)) {
      case 0:
        return allocate(in, array, ref, valid);
      case 1: {
        hold(qsUtilHS_FreeArray_CSG(array) == (valid ? 0 : -33620097), "freeing");
        if (!valid) return;
        hold(!ref.block, "a reference of no array");
        if (found != live_.end()) live_.erase(found);
        return;
      }
      case 2:
        return release(in.choice(owners));
      case 3: {
        std::uint32_t length = 7, *const to = in.one_in(16) ? nullptr : &length;
        const auto code = qsUtilHS_ArrayLength_CSG(array, to);
        hold(code == (!valid || !to ? -33620121 : found == live_.end() ? -33620126 : 0), "code of a length");
        return hold(code != 0 || length == found->second.count, "length");
      }
      default:
        return read(in, on, array, valid);
    }
  }

 private:
  static constexpr unsigned owners = 3;
  struct stored {
    std::uint64_t owner;
    std::uint32_t count;
  };

  void allocate(input &in, lumra_array_ref **array, lumra_array_ref &ref, bool valid) {
    const std::uint64_t owner = in.choice(owners);
    const std::int32_t large = in.flag() ? 1 << 29 : std::numeric_limits<std::int32_t>::max();
    const std::int32_t count = in.one_in(16) ? (in.flag() ? large : -large) : in.count() * (in.flag() ? 1 : 9);
    const auto code = qsUtilHS_AllocateArray_CSG(array, count, owner);
    hold(code == (!valid ? -33620066 : count < 0 ? -33620069 : count >= 1 << 29 ? -33620079 : 0), "allocating");
    if (code != 0) return;
    lumra_array_block *const block = ref.block;
    hold(!!block == (count > 0), "an array for every reference but empty ones");
    if (!block) return;
    const lumra_array_block &made = *block;
    hold(live_.emplace(block, stored{owner, made.count}).second, "an array that nobody has");
    hold(static_cast<std::int32_t>(made.count) == count && (*made.handle)->elements == made.data, "size of an array");
    for (std::uint32_t i = 0; i < made.count; ++i) made.data[i] = {static_cast<float>(i), 1};
  }

  static void read(input &in, call &on, lumra_array_ref **array, bool valid) {
    auto &out = on.give<lumra_cf32_block>(writes);
    const std::int32_t offset = in.one_in(8) ? input::extreme(in.byte()) : in.count() - 40;
    const std::int32_t count = in.one_in(8) ? -in.count() : in.count();
    auto *const to = in.one_in(16) ? nullptr : reinterpret_cast<lumra_cf32_array *>(&out.handle);
    const auto before = out.now();
    const auto code = qsUtilHS_ReadArray_CSG(array, to, offset, count);
    if (!valid || !to) return hold(code == -33620139, "code of a reference");
    if (count < 0) return hold(code == -33620069, "code of a count");
    if (code == -33620151) return hold(!on.plain() && out.count() == before.size(), "a refused resize");
    hold(code == 0 && out.count() == static_cast<std::size_t>(count), "number of elements");
  }

  void release(std::uint64_t owner) {
    hold(qsUtilHS_FreeArrayIDH_CSG(owner) == 0, "release");
    std::erase_if(live_, [&](const auto &entry) { return entry.second.owner == owner; });
  }

  lumra_array_ref refs_[4];
  std::map<lumra_array_block *, stored> live_;
};

/// Byte FIFOs by name. Transfers that would wait are left out.
class fifos {
 public:
  fifos() = default;
  fifos(const fifos &) = delete;
  fifos &operator=(const fifos &) = delete;
  ~fifos() {
    for (std::uint64_t *&cell : cells_) hold(qsLTEHS_DataFIFOUnreserve(&cell) == 0 && !cell, "cell");
  }

  void step(input &in) {
    const unsigned what = in.choice(8);
    if (what < 2) return create(in);
    if (what == 2 && !cells_.empty()) return unreserve(in);
    const std::uint64_t handle =
        in.one_in(8) || handles_.empty() ? in.raw<std::uint64_t>() : handles_[in.byte() % handles_.size()];
    const auto found = open_.find(handle);
    const bool known = found != open_.end();
    if (what == 3) {
      hold(qsLTEHS_DataFIFO_Flush(handle) == (known ? 0 : -2), "flush");
      if (known) found->second.bytes.clear();
    } else if (what == 4 && in.flag()) {
      hold(qsLTEHS_DataFIFODelete(handle) == 0, "deletion");
      if (known) open_.erase(found);
    } else if (what == 4) {
      std::uint32_t capacity = 7, fill = 7;
      hold(qsLTEHS_DataFIFO_GetStatus(handle, in.one_in(8) ? nullptr : &capacity, &fill) == (known ? 0 : -2), "status");
      hold(fill == (known ? found->second.bytes.size() : 0), "fill");
      hold(capacity == 7 || capacity == (known ? found->second.capacity : 0), "capacity");
    } else {
      transfer(in, handle, known ? &found->second : nullptr);
    }
  }

 private:
  struct fifo {
    std::string name;
    std::uint32_t capacity = 0;
    std::string bytes;
  };

  void create(input &in) {
    constexpr std::uint32_t capacities[] = {0, 1, 8, 64, 300, 4096};
    const std::string name =
        in.one_in(16) ? std::string(300, 'n') : std::string(1, static_cast<char>('a' + in.choice(20)));
    const std::uint32_t capacity = capacities[in.choice(6)], flags = in.choice(4);
    const bool unnamed = in.one_in(32);
    std::uint64_t *cell = nullptr, **const to = in.one_in(16) ? nullptr : &cell;
    const std::uint64_t handle = qsLTEHS_DataFIFOCreate(unnamed ? nullptr : name.c_str(), capacity, flags, to);
    if (!to) return hold(handle == 0, "nothing without a place for the cell");
    hold(cell && *cell == handle, "a cell holds the handle");
    cells_.push_back(cell);
    handles_.push_back(handle);
    if (handle == 0) return hold(open_.size() >= 16, "room for a FIFO");
    if (const auto same = open_.find(handle); same != open_.end()) {
      hold(flags & LUMRA_FIFO_REUSE && same->second.bytes.size() >= capacity, "a FIFO that is taken again");
      return same->second.bytes.clear();
    }
    const std::string known_by = unnamed ? "" : name.substr(0, 255);
    std::erase_if(open_, [&](const auto &entry) { return entry.second.name == known_by; });
    open_[handle] = {known_by, capacity, {}};
  }

  void unreserve(input &in) {
    std::uint64_t forged = in.raw<std::uint64_t>(), *cell = &forged;
    hold(qsLTEHS_DataFIFOUnreserve(in.flag() ? &cell : nullptr) == -2, "no cell");
    const std::size_t which = in.byte() % cells_.size();
    open_.erase(*cells_[which]);
    hold(qsLTEHS_DataFIFOUnreserve(&cells_[which]) == 0 && !cells_[which], "a cell that is given back");
    cells_.erase(cells_.begin() + static_cast<std::ptrdiff_t>(which));
  }

  static void transfer(input &in, std::uint64_t handle, fifo *at) {
    const bool writes_bytes = in.flag();
    const std::uint32_t count =
        in.one_in(16) ? in.raw<std::uint32_t>() | 1U << 31 : static_cast<std::uint32_t>(in.count());
    const std::uint32_t offset = in.choice(9);
    std::vector<char> data(offset + (count < 1U << 31 ? count : 0));
    for (char &c : data) c = static_cast<char>(in.byte());
    void *const buffer = in.one_in(32) || data.empty() ? nullptr : data.data();
    const bool valid = at && count < 1U << 31 && (buffer || count == 0);
    if (valid && count > (writes_bytes ? at->capacity - at->bytes.size() : at->bytes.size())) return;  // it would wait
    const auto got = qsLTEHS_DataFIFO(handle, writes_bytes ? LUMRA_FIFO_WRITE : in.option(5) | LUMRA_FIFO_READ,
                                      writes_bytes ? buffer : nullptr, writes_bytes ? nullptr : buffer, offset, count);
    hold(got == (valid ? static_cast<std::int32_t>(count) : -2), "code of a transfer");
    if (!valid || count == 0) return;
    const char *const first = data.data() + offset;
    if (writes_bytes) return void(at->bytes.append(first, count));
    hold(at->bytes.compare(0, count, first, count) == 0, "bytes come out as they went in");
    at->bytes.erase(0, count);
  }

  std::map<std::uint64_t, fifo> open_;
  std::vector<std::uint64_t> handles_;
  std::vector<std::uint64_t *> cells_;
};

/// Filters by key; records may be stale or forged.
class filters {
 public:
  filters() = default;
  filters(const filters &) = delete;
  filters &operator=(const filters &) = delete;
  ~filters() {
    for (auto &[identifier, held] : references_)
      for (; held.count > 0; --held.count) hold(qsUtilHS_UnegisterFilterSpec(&held.record) == 0, "reference");
  }

  void step(input &in, call &on) {
    lumra_filter_record &record = records_[in.choice(4)], *const place = in.one_in(32) ? nullptr : &record;
    if (in.one_in(32)) record.identifier = in.raw<std::uint64_t>();
    if (in.one_in(32)) record.entry = in.raw<const lumra_filter_entry *>();
    lumra_filter_key key{in.option(3), {}, {}};
    // The first is a rate, the others edges, decibels or symbols. Special values come with a count.
    const bool special = in.one_in(8);
    for (double &value : key.values) value = special ? in.real() * 4 : in.choice(40);
    key.values[0] = special ? key.values[0] : 80;
    const lumra_filter_key *const spec = in.one_in(32) ? nullptr : &key;
    switch (in.choice(3)) {
      case 0: {
        auto &given = on.give<lumra_f32_block>(reads, static_cast<int>(in.choice(40)));
        const std::uint64_t count = special ? 1 + in.byte() : in.one_in(4) ? in.choice(300) : 0;
        const auto code = qsUtilHS_RegisterFilterSpec(place, static_cast<lumra_f32_block **>(given), spec,
                                                      in.one_in(32) ? in.raw<std::uint64_t>() | 1ULL << 32 : count);
        if (check_code(code, {-50462874, -50462898})) return;
        return take(record);
      }
      case 1: {
        const auto code = qsUtilHS_UnegisterFilterSpec(place);
        const auto held = references_.find(record.identifier);
        const bool known =
            held != references_.end() && held->second.count > 0 && held->second.record.entry == record.entry;
        hold(code == (!place                                ? -50462818
                      : !record.entry || !record.identifier ? -50462821
                      : known                               ? 0
                                                            : -50462843),
             "code of a reference that is given back");
        if (code == 0) --held->second.count;
        return;
      }
      default: {
        const bool erases = in.flag();
        const auto code = qsUtilHS_MatchFilterSpecErase(place, spec, erases);
        if (code == 0) hold(!erases, "a match"), take(record);
        if (code != -50462794 || !erases) check_code(code, {-50462763, -50462766, -50462810});
      }
    }
  }

 private:
  struct held_filter {
    lumra_filter_record record;
    int count;
  };

  void take(const lumra_filter_record &record) {
    const lumra_filter_entry &entry = *record.entry;
    hold(entry.n > 0 && entry.identifier == record.identifier, "a filter that is registered");
    for (std::uint64_t i = 0; i < entry.n && entry.key.kind != LUMRA_FILTER_GIVEN; ++i)
      hold(std::abs(entry.coefficients[i]) <= 2, "a design is finite");
    held_filter &held = references_[record.identifier];
    held.record = record;
    ++held.count;
  }

  lumra_filter_record records_[4] = {};
  std::map<std::uint64_t, held_filter> references_;
};

void descriptor(input &in) {
  constexpr std::uint32_t lengths[] = {0, 1, 2, 7, 64, 100, 1000, (1U << 27) + 1, 0xFFFFFFFF};
  lumra_resampler_descriptor *made = nullptr;
  const std::uint32_t length = lengths[in.choice(9)], buffer = in.choice(3), inverse = in.choice(3);
  auto **const to = in.one_in(16) ? nullptr : &made;
  const auto code = qsUtilHS_FFTResampler_CSG_CreateDescriptor(to, length, buffer, inverse, in.choice(3));
  hold(code == (!to ? -50397684 : length == 0 || length > 1U << 27 ? -50397485 : 0), "code of a descriptor");
  hold(!!made == (code == 0), "a descriptor, or null");
  if (made)
    hold(made->status == 0 && made->length == length && made->buffer_flag == buffer && made->inverse_flag == inverse &&
             !!made->aligned_buffer == (buffer && inverse),
         "descriptor");
}

void failures(input &in) {
  std::uint64_t count = 0, after = 0;
  hold(qsrfhs_getErrorCnt(&count) == 0, "number of failures");
  std::vector<std::int32_t> codes(count < 4000 ? count : in.choice(8));
  const auto code = qsrfhs_getErrors(in.one_in(8) ? nullptr : codes.data(), codes.size());
  check_code(code, {-67371105, -67371113});
  hold(qsrfhs_getErrorCnt(&after) == 0 && after == count + (code != 0), "a failure is recorded");
  for (const auto recorded : codes) hold(recorded <= 0, "a code");
  hold(qsrfhs_getErrorCnt(in.one_in(8) ? nullptr : &count) <= 0 && qsUtilHS_NumCPUs() >= 1 && qsLTEHS() == -312402,
       "constant answers");
}

void host_array(input &in) {
  constexpr std::int32_t types[] = {9, 10, 12, 13, 0, -1, 11, 14};
  const std::int32_t type = types[in.choice(in.one_in(4) ? 8 : 4)];
  const auto dimensions = static_cast<std::int32_t>(in.one_in(8) ? in.choice(4) : 1 + in.choice(2));
  const bool valid = host::element_size(host::element_type{type}) != 0 && (dimensions == 1 || dimensions == 2);
  const std::int32_t sizes[] = {in.one_in(8) ? input::extreme(in.byte()) % 7 : in.count(), in.one_in(8) ? -1 : 3};
  lumra_f32_array array = nullptr;
  const bool negative = valid && (sizes[0] < 0 || (dimensions == 2 && sizes[1] < 0));
  hold(qsHost_ArrayNew(type, dimensions, sizes, &array) == (!valid ? -20061 : negative ? -20004 : 0), "new array");
  hold(!!array == (valid && !negative), "an array, or null");
  const std::uint64_t size =
      in.one_in(8) ? in.raw<std::uint64_t>() | 1ULL << 31 : static_cast<std::uint64_t>(in.count());
  const auto code = qsHost_ArrayResize(type, dimensions, &array, size);
  hold(code == (!valid ? -20061 : size > 0x7FFFFFFF ? -20001 : 0), "resized array");
  if (array && !negative) hold((*array)->count == sizes[0], "the sizes stay");
  if (array && code == 0)
    std::memset(reinterpret_cast<char *>(*array) + host::header_size(host::element_type{type}, dimensions), 1,
                size * host::element_size(host::element_type{type}));
  hold(qsHost_ArrayFree(&array) == 0 && !array && qsHost_ArrayFree(&array) == 0 && qsHost_ArrayFree(nullptr) == 0,
       "free");
}

}  // namespace

void run(input &in) {
  hosting host(in, hosting::unit::bytes);
  store arrays;
  fifos byte_fifos;
  filters designs;
  for (int calls = 0; in.left() && calls < 40; ++calls) {
    call on(in, host);
    const unsigned what = in.choice(12);
    if (what == 0) descriptor(in);
    if (what == 1) failures(in);
    if (what == 2) host_array(in);
    if (what >= 3 && what < 6) designs.step(in, on);
    if (what >= 6 && what < 9) arrays.step(in, on);
    if (what >= 9) byte_fifos.step(in);
    on.check_inputs();
  }
}

}  // namespace fuzz
