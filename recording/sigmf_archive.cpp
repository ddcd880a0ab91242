// SPDX-License-Identifier: MIT
#include "recording/sigmf_archive.hpp"

#include <archive.h>
#include <archive_entry.h>

#include <algorithm>
#include <cerrno>
#include <new>
#include <nlohmann/json.hpp>
#include <utility>
#include <vector>

#include "recording/failure.hpp"
#include "recording/file.hpp"
#include "recording/metadata_text.hpp"
#include "recording/sigmf_metadata.hpp"

namespace recording {
namespace {

namespace fs = std::filesystem;

/// A recording has two files; an archive with more of them than this is something else.
constexpr std::size_t most_members = 1000;
/// So many bytes of a member are compared with those at the place in the file where it seems to lie.
constexpr std::size_t compared_bytes = 4096;

bool has_archive_suffix(const fs::path &path) {
  fs::path suffix = path.extension();
  if (suffix == ".tgz") return true;
  for (const char *compression : {".gz", ".bz2", ".xz", ".zst"})
    if (suffix == compression) {
      suffix = path.stem().extension();
      break;
    }
  return suffix == ".sigmf" || suffix == ".tar";
}

/// An archive that is read member by member.
class archive_file {
 public:
  explicit archive_file(fs::path path) : path_(std::move(path)), file_(archive_read_new()) {
    if (!file_) throw std::bad_alloc();
    archive *const a = file_.get();
    for (const auto support :
         {archive_read_support_format_tar, archive_read_support_filter_none, archive_read_support_filter_gzip,
          archive_read_support_filter_bzip2, archive_read_support_filter_xz, archive_read_support_filter_zstd})
      check(support(a));
    check(archive_read_open_filename(a, path_.c_str(), std::size_t{1} << 17));
  }

  /// Goes to the next member; gives whether there is one.
  bool next() {
    const int code = archive_read_next_header(file_.get(), &entry_);
    if (code == ARCHIVE_EOF) return false;
    check(code);
    return true;
  }
  [[nodiscard]] bool is_file() const noexcept { return archive_entry_filetype(entry_) == AE_IFREG; }
  [[nodiscard]] std::string name() const {
    const char *text = archive_entry_pathname(entry_);
    return text ? text : "";
  }
  [[nodiscard]] std::uint64_t size() const noexcept {
    return static_cast<std::uint64_t>(std::max<la_int64_t>(archive_entry_size(entry_), 0));
  }
  /// Where the member's bytes seem to lie in the file, where they can: neither compressed nor with holes.
  [[nodiscard]] std::optional<std::uint64_t> place() const {
    if (archive_filter_code(file_.get(), 0) != ARCHIVE_FILTER_NONE || archive_entry_sparse_count(entry_) > 0)
      return std::nullopt;
    return static_cast<std::uint64_t>(archive_filter_bytes(file_.get(), 0));
  }
  /// Gives the member's next bytes; none at its end.
  std::size_t read(std::span<std::byte> to) {
    const la_ssize_t count = archive_read_data(file_.get(), to.data(), to.size());
    if (count < 0) check(ARCHIVE_FATAL);
    return static_cast<std::size_t>(count);
  }

 private:
  void check(int code) {
    if (code == ARCHIVE_OK || code == ARCHIVE_WARN) return;
    if (archive_errno(file_.get()) == ENOMEM) throw std::bad_alloc();
    const char *text = archive_error_string(file_.get());
    throw failure("{}: cannot be read as an archive: {}; is the file complete?", path_.string(),
                  text ? text : "no reason is known");
  }

  struct closer {
    void operator()(archive *file) const noexcept { (void)archive_read_free(file); }
  };

  fs::path path_;
  std::unique_ptr<archive, closer> file_;
  archive_entry *entry_ = nullptr;
};

/// The bytes of one member as they are unpacked.
class member_reader final : public sequential_reader {
 public:
  member_reader(const fs::path &path, std::size_t index) : file_(path) {
    for (std::size_t i = 0; i <= index; ++i)
      if (!file_.next()) throw failure("{}: became shorter while it was read; try again", path.string());
  }

 private:
  std::size_t next(std::span<std::byte> to) override { return file_.read(to); }

  archive_file file_;
};

struct member {
  std::string name;
  std::size_t index;
  std::uint64_t size;
  std::optional<std::uint64_t> place;  // in the archive's file
};

/// The place, if the file holds the member's first bytes there and has room for all of them.
std::optional<std::uint64_t> confirmed_place(archive_file &file, const fs::path &path, std::uint64_t file_size) {
  const auto place = file.place();
  if (!place || *place > file_size || file.size() > file_size - *place) return std::nullopt;
  std::vector<std::byte> unpacked(compared_bytes), there(compared_bytes);
  unpacked.resize(file.read(unpacked));
  there.resize(read_file(path)->read(*place, std::span(there).first(unpacked.size())));
  return unpacked == there ? place : std::nullopt;
}

std::string text_of_member(archive_file &file, const std::string &where) {
  std::string text;
  std::vector<std::byte> piece(std::size_t{1} << 16);
  while (const std::size_t count = file.read(piece)) {
    text.append(reinterpret_cast<const char *>(piece.data()), count);
    if (text.size() > largest_metadata) refuse_size(where);
  }
  return text;
}

}  // namespace

std::optional<source> open_sigmf_archive(const fs::path &path, const options &said) {
  if (!has_archive_suffix(path)) return std::nullopt;
  const std::uint64_t file_size = readable_size(path);
  archive_file file(path);
  std::vector<member> members;
  std::string meta_name;
  std::shared_ptr<const nlohmann::json> metadata;
  for (std::size_t index = 0; file.next(); ++index) {
    if (index == most_members)
      throw failure("{}: holds more than {} files; unpack it and give one recording", path.string(), most_members);
    if (!file.is_file()) continue;
    if (!file.name().ends_with(".sigmf-meta")) {
      members.push_back({file.name(), index, file.size(), confirmed_place(file, path, file_size)});
      continue;
    }
    if (metadata) throw failure("{}: holds several recordings; unpack it and give one of them", path.string());
    meta_name = file.name();
    const std::string where = path.string() + ": " + meta_name;
    metadata = std::make_shared<const nlohmann::json>(parse_metadata(text_of_member(file, where), where));
  }
  if (!metadata) throw failure("{}: holds no .sigmf-meta file; is it a SigMF archive?", path.string());

  const fs::path meta(meta_name);
  const std::string where = path.string() + ": " + meta_name;
  const fs::path data = meta.parent_path() / dataset_name(*metadata, meta.stem().string() + ".sigmf-data", where);
  const auto found = std::find_if(members.begin(), members.end(), [&](const member &m) { return m.name == data; });
  if (found == members.end()) throw failure("{}: holds no {}", path.string(), data.string());
  source result;
  result.name = meta.stem().string();
  result.data = path;
  result.files = {path};
  describe(result, std::move(metadata), where, found->size, said);
  result.ranged = found->place.has_value();
  if (result.ranged)
    result.bytes = [path, place = *found->place] { return read_file(path, place); };
  else
    result.bytes = [path, index = found->index] { return std::make_unique<member_reader>(path, index); };
  return result;
}

}  // namespace recording
