// SPDX-License-Identifier: MIT
#include "recording/sigmf_archive_writer.hpp"

#include <archive.h>
#include <archive_entry.h>

#include <cerrno>
#include <exception>
#include <new>
#include <nlohmann/json.hpp>

#include "recording/failure.hpp"
#include "recording/sigmf_writer.hpp"

namespace recording {
namespace {

struct write_closer {
  void operator()(archive *file) const noexcept { (void)archive_write_free(file); }
};
struct entry_closer {
  void operator()(archive_entry *entry) const noexcept { archive_entry_free(entry); }
};

}  // namespace

struct sigmf_archive_writer::state {
  explicit state(byte_sink &sink) noexcept : to(sink) {}

  byte_sink &to;
  std::exception_ptr refused;  // what the sink threw: it must not pass through the other library
  std::unique_ptr<archive, write_closer> file{archive_write_new()};

  static la_ssize_t pass_on(archive *file, void *self, const void *bytes, std::size_t count) {
    auto &own = *static_cast<state *>(self);
    try {
      own.to.write({static_cast<const std::byte *>(bytes), count});
      return static_cast<la_ssize_t>(count);
    } catch (...) {
      own.refused = std::current_exception();
      archive_set_error(file, EIO, "the sink refuses");
      return -1;
    }
  }

  void check(int code) const {
    if (refused) std::rethrow_exception(refused);
    if (code == ARCHIVE_OK || code == ARCHIVE_WARN) return;
    if (archive_errno(file.get()) == ENOMEM) throw std::bad_alloc();
    throw failure("cannot write an archive: {}", archive_error_string(file.get()));
  }

  void begin(const std::string &name, std::uint64_t bytes) {
    const std::unique_ptr<archive_entry, entry_closer> entry(archive_entry_new());
    if (!entry) throw std::bad_alloc();
    archive_entry_set_pathname(entry.get(), name.c_str());
    archive_entry_set_filetype(entry.get(), AE_IFREG);
    archive_entry_set_perm(entry.get(), 0644);
    archive_entry_set_size(entry.get(), static_cast<la_int64_t>(bytes));
    check(archive_write_header(file.get(), entry.get()));
  }

  void add(std::span<const std::byte> bytes) {
    while (!bytes.empty()) {
      const la_ssize_t count = archive_write_data(file.get(), bytes.data(), bytes.size());
      check(count > 0 ? ARCHIVE_OK : ARCHIVE_FATAL);
      bytes = bytes.subspan(static_cast<std::size_t>(count));
    }
  }
};

sigmf_archive_writer::sigmf_archive_writer(byte_sink &to, const std::string &name, const nlohmann::json &metadata,
                                           std::uint64_t data_bytes)
    : state_(std::make_unique<state>(to)) {
  if (!state_->file) throw std::bad_alloc();
  archive *const file = state_->file.get();
  state_->check(archive_write_set_format_pax_restricted(file));
  state_->check(archive_write_add_filter_none(file));
  state_->check(archive_write_open(file, state_.get(), nullptr, state::pass_on, nullptr));
  const std::string text = metadata_text(metadata), base = name + "/" + name;
  state_->begin(base + ".sigmf-meta", text.size());
  state_->add(std::as_bytes(std::span(text)));
  state_->begin(base + ".sigmf-data", data_bytes);
}

sigmf_archive_writer::~sigmf_archive_writer() = default;

void sigmf_archive_writer::write(std::span<const std::byte> bytes) {
  state_->add(bytes);
}

void sigmf_archive_writer::finish() {
  state_->check(archive_write_close(state_->file.get()));
}

}  // namespace recording
