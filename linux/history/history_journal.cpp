#include "history_journal.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zlib.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <optional>
#include <string_view>
#include <utility>

#include "file_descriptor.h"
#include "files.h"

namespace vorn {
namespace {

using Record = HistoryJournal::Record;

constexpr mode_t kOwnerOnly = 0600;
constexpr std::size_t kHeadSize = 26;  // kind, 16 digits of the payload's size, 8 of its checksum, line feed

unsigned long Checksum(std::string_view payload) {
  return crc32_z(0, reinterpret_cast<const Bytef*>(payload.data()), payload.size());
}

// A field is its size, a colon, and its bytes.
std::string Encode(const Record& record) {
  std::string payload;
  for (const std::string& field : record.fields) payload += std::to_string(field.size()) + ":" + field;
  std::array<char, kHeadSize + 1> head{};
  std::snprintf(head.data(), head.size(), "%c%016zx%08lx\n", static_cast<char>(record.kind), payload.size(),
                Checksum(payload));
  return std::string(head.data(), kHeadSize) + payload;
}

std::optional<std::size_t> Number(std::string_view digits, int base) {
  std::size_t number = 0;
  const char* end = digits.data() + digits.size();
  const auto read = std::from_chars(digits.data(), end, number, base);
  if (read.ec != std::errc() || read.ptr != end) return std::nullopt;
  return number;
}

std::optional<std::vector<std::string>> DecodeFields(std::string_view payload) {
  std::vector<std::string> fields;
  while (!payload.empty()) {
    const std::string_view digits = payload.substr(0, payload.find(':'));
    const std::optional<std::size_t> size = Number(digits, 10);
    if (!size || *size > payload.size() - digits.size() - 1) return std::nullopt;
    fields.emplace_back(payload.substr(digits.size() + 1, *size));
    payload.remove_prefix(digits.size() + 1 + *size);
  }
  return fields;
}

// Takes the first record off `text`. std::nullopt, and an unchanged text, if it is not complete.
std::optional<Record> TakeRecord(std::string_view* text) {
  if (text->size() < kHeadSize) return std::nullopt;
  const std::optional<std::size_t> size = Number(text->substr(1, 16), 16);
  const std::optional<std::size_t> checksum = Number(text->substr(17, 8), 16);
  if (!size || !checksum || *size > text->size() - kHeadSize) return std::nullopt;
  const std::string_view payload = text->substr(kHeadSize, *size);
  if (Checksum(payload) != *checksum) return std::nullopt;
  std::optional<std::vector<std::string>> fields = DecodeFields(payload);
  if (!fields) return std::nullopt;
  const auto kind = static_cast<Record::Kind>(text->front());
  text->remove_prefix(kHeadSize + *size);
  return Record{kind, std::move(*fields)};
}

// Whether it is the journal with this first record. An empty string is the first record of none.
bool BeginsWith(const FileDescriptor& file, const std::string& first) {
  std::string begin(first.size(), '\0');
  const ssize_t got = pread(file.get(), begin.data(), begin.size(), 0);
  return !first.empty() && got == static_cast<ssize_t>(begin.size()) && begin == first;
}

}  // namespace

Result<std::vector<Record>> HistoryJournal::ReadNew(bool* is_new) {
  std::vector<Record> records;
  const FileDescriptor file(open(location_.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
  struct stat stat {};
  if (!file && errno != ENOENT) return Status::System(errno, location_);
  if (file && fstat(file.get(), &stat) != 0) return Status::System(errno, location_);
  *is_new = !file || !BeginsWith(file, first_);
  if (*is_new) read_ = 0;
  if (!file || stat.st_size == read_) return records;
  std::string text(static_cast<std::size_t>(stat.st_size - read_), '\0');
  const ssize_t got = pread(file.get(), text.data(), text.size(), read_);
  if (got != static_cast<ssize_t>(text.size())) return Status::System(got < 0 ? errno : EIO, location_);
  std::string_view rest = text;
  while (std::optional<Record> record = TakeRecord(&rest)) records.push_back(std::move(*record));
  if (*is_new && !records.empty()) first_ = Encode(records.front());
  read_ = stat.st_size - static_cast<off_t>(rest.size());
  if (Status status = rest.empty() ? Status() : Truncate(read_); !status.ok()) return status;
  return records;
}

Status HistoryJournal::Append(const Record& record, bool durable) {
  const FileDescriptor file(open(location_.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC | O_NOFOLLOW));
  if (!file) return Status::System(errno, location_);
  const std::string text = Encode(record);
  Status status = WriteAll(file.get(), text, location_);
  if (status.ok() && durable && fdatasync(file.get()) != 0) status = Status::System(errno, location_);
  if (status.ok()) {
    read_ += static_cast<off_t>(text.size());
  } else {
    // A record that is appended after an incomplete one could not be read. If the journal cannot be truncated, the next
    // reader truncates it.
    static_cast<void>(Truncate(read_));
  }
  return status;
}

Status HistoryJournal::Restart(const Record& record) {
  const Result<FileStamp> stamp = StampOfFile(location_);
  if (!stamp.ok()) return stamp.status();
  const std::string text = Encode(record);
  const Result<FileStamp> written = ReplaceFile(location_, text, *stamp, kOwnerOnly);
  if (!written.ok()) return written.status();
  read_ = static_cast<off_t>(text.size());
  first_ = text;
  return {};
}

Status HistoryJournal::Truncate(off_t size) const {
  return truncate(location_.c_str(), size) == 0 ? Status() : Status::System(errno, location_);
}

}  // namespace vorn
