#include "ini_file.h"

namespace vorn {

Result<SharedIniFile> IniFile::Open(Box& box, const std::string& path) { return box.Load<IniFile>(path, Parse); }

SharedIniFile IniFile::FromText(std::string location, std::string_view text) {
  return std::shared_ptr<const IniFile>(
      new IniFile(std::move(location), Version{}, IniDocument::Parse(std::string(text))));
}

Result<IniFile> IniFile::Parse(StoredFile file) {
  return IniFile(std::move(file.location), file.version, IniDocument::Parse(std::move(file.text)));
}

Status IniFile::Refuse(std::string_view section, std::string_view key, const std::string& why) const {
  const std::optional<IniSetting> setting = document_.Find(section, key);
  const std::string line = location_ + ":" + std::to_string(setting ? setting->line : 0);
  return Status::Failure(kSyntax, line + ": " + std::string(key) + " " + why);
}

Result<IniEditor> IniEditor::Open(Box& box, const std::string& path, std::string_view heading) {
  Result<StoredFile> file = box.Read(path);
  if (!file.ok()) return file.status();
  if (!file->version.exists) file->text = heading;
  IniDocument document = IniDocument::Parse(file->text);
  return IniEditor(box, path, std::move(file->location), std::move(file->text), file->version, std::move(document));
}

Status IniEditor::Save() {
  std::string text = document_.Text();
  if (text == text_) return box_->Confirm(path_);
  Status status = box_->Replace(path_, text, version_);
  if (status.ok()) text_ = std::move(text);
  return status;
}

}  // namespace vorn
