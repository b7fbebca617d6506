#include "ini_file.h"

#include <cerrno>
#include <cstdlib>

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

// Decimal, octal or hexadecimal without any further text, as nfs-utils reads a number.
std::optional<long> ParseNumber(const std::string& text) {
  char* end = nullptr;
  errno = 0;
  const long number = std::strtol(text.c_str(), &end, 0);
  if (errno != 0 || end == text.c_str() || *end != '\0') return std::nullopt;
  return number;
}

Result<IniDocument> ParseDocument(const std::string& text, const std::string& location) {
  std::optional<IniDocument> document = IniDocument::Parse(text);
  if (!document) return Status::Failure(kSyntax, location + " has a NUL byte");
  return std::move(*document);
}

}  // namespace

Result<SharedIniFile> IniFile::Open(Box& box, const std::string& path) { return box.Load<IniFile>(path, Parse); }

Result<IniFile> IniFile::Parse(StoredFile file) {
  Result<IniDocument> document = ParseDocument(file.text, file.location);
  if (!document.ok()) return document.status();
  return IniFile(std::move(file.location), file.version, std::move(*document));
}

Result<std::optional<int>> IniFile::Number(std::string_view section, std::string_view key, int largest) const {
  const std::optional<std::string> text = document_.Get(section, key);
  if (!text) return std::optional<int>();
  const std::optional<long> number = ParseNumber(*text);
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
  const std::string line = location_ + ":" + std::to_string(document_.LineOf(section, key));
  return Status::Failure(kSyntax, line + ": " + std::string(key) + " " + why);
}

Result<IniEditor> IniEditor::Open(Box& box, const std::string& path, std::string_view heading) {
  Result<StoredFile> file = box.Read(path);
  if (!file.ok()) return file.status();
  if (!file->version.exists) file->text = heading;
  Result<IniDocument> document = ParseDocument(file->text, file->location);
  if (!document.ok()) return document.status();
  return IniEditor(box, path, std::move(file->location), std::move(file->text), file->version, std::move(*document));
}

Status IniEditor::Save() {
  std::string text = document_.Text();
  if (text == text_) return box_->Confirm(path_);
  Status status = box_->Replace(path_, text, version_);
  if (status.ok()) text_ = std::move(text);
  return status;
}

}  // namespace vorn
