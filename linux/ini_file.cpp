#include "ini_file.h"

#include <cerrno>
#include <cstdlib>

#include "root.h"

namespace vorn {
namespace {

constexpr const char* kYes[] = {"1", "t", "true", "y", "yes", "on"};
constexpr const char* kNo[] = {"0", "f", "false", "n", "no", "off"};

template <std::size_t kSize>
bool IsOneOf(const std::string& word, const char* const (&words)[kSize]) {
  const std::string folded = FoldIniName(word);
  for (const char* other : words) {
    if (folded == other) return true;
  }
  return false;
}

// A number with nothing behind it, decimal, octal or hexadecimal: as nfs-utils reads one.
std::optional<long> NumberOf(const std::string& text) {
  char* end = nullptr;
  errno = 0;
  const long number = std::strtol(text.c_str(), &end, 0);
  if (errno != 0 || end == text.c_str() || *end != '\0') return std::nullopt;
  return number;
}

}  // namespace

Result<IniFile> IniFile::Open(std::string_view path, std::string_view heading) {
  Result<std::string> place = Root::Current().Locate(path);
  if (!place.ok()) return place.status();
  Result<FileText> file = ReadFileOrNothing(*place);
  if (!file.ok()) return file.status();
  if (!file->stamp.exists) file->text = heading;
  std::optional<IniDocument> document = IniDocument::Parse(file->text);
  if (!document) return Status::Failure(kSyntax, *place + " has a NUL byte");
  return IniFile(std::move(*place), std::move(*file), std::move(*document));
}

Result<std::optional<int>> IniFile::Number(std::string_view section, std::string_view key, int largest) const {
  const std::optional<std::string> text = document_.Get(section, key);
  if (!text) return std::optional<int>();
  const std::optional<long> number = NumberOf(*text);
  if (!number || *number < 0 || *number > largest) {
    return Refuse(section, key, "is no number from 0 to " + std::to_string(largest));
  }
  return std::optional<int>(static_cast<int>(*number));
}

Result<std::optional<bool>> IniFile::Switch(std::string_view section, std::string_view key) const {
  const std::optional<std::string> text = document_.Get(section, key);
  if (!text) return std::optional<bool>();
  if (IsOneOf(*text, kYes)) return std::optional<bool>(true);
  if (IsOneOf(*text, kNo)) return std::optional<bool>(false);
  return Refuse(section, key, "is neither yes nor no");
}

Status IniFile::Refuse(std::string_view section, std::string_view key, const std::string& why) const {
  const std::string line = path_ + ":" + std::to_string(document_.LineOf(section, key));
  return Status::Failure(kSyntax, line + ": " + std::string(key) + " " + why);
}

Result<FileStamp> IniFile::Save() const {
  const std::string text = document_.Text();
  if (text == text_) {
    const Status confirmed = ConfirmFile(path_);
    return confirmed.ok() ? Result<FileStamp>(stamp_) : confirmed;
  }
  if (Status status = ReplaceFile(path_, text, stamp_); !status.ok()) return status;
  const Result<FileText> written = ReadFile(path_);
  if (!written.ok()) return written.status();
  return written->stamp;
}

}  // namespace vorn
