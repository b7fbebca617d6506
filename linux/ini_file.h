// An INI file of the box: read, edited, and written when an edit changed it.
#ifndef VORN_LINUX_INI_FILE_H
#define VORN_LINUX_INI_FILE_H

#include <limits>
#include <optional>
#include <string>
#include <string_view>

#include "files.h"
#include "ini_document.h"
#include "status.h"

namespace vorn {

class IniFile {
 public:
  // The file at the box's `path`. No file reads as an empty one; when one is made of it, it begins
  // with `heading`.
  static Result<IniFile> Open(std::string_view path, std::string_view heading = {});

  const std::string& path() const { return path_; }  // on this system
  const FileStamp& stamp() const { return stamp_; }
  IniDocument& document() { return document_; }
  const IniDocument& document() const { return document_; }

  // Numbers as C writes them, switches by the words of nfs.conf(5). None when the key has no value;
  // a value that is none of these, or out of range, is a failure that names its line.
  Result<std::optional<int>> Number(std::string_view section, std::string_view key,
                                    int largest = std::numeric_limits<int>::max()) const;
  Result<std::optional<bool>> Switch(std::string_view section, std::string_view key) const;

  // A failure that says what is wrong with a key's value, and in which line.
  Status Refuse(std::string_view section, std::string_view key, const std::string& why) const;

  // Writes the document if it differs from the file, whose stamp is the result then. The caller holds
  // the configuration lock.
  Result<FileStamp> Save() const;

 private:
  IniFile(std::string path, FileText file, IniDocument document)
      : path_(std::move(path)), text_(std::move(file.text)), stamp_(file.stamp), document_(std::move(document)) {}

  std::string path_;
  std::string text_;  // what the document was made of
  FileStamp stamp_;
  IniDocument document_;
};

}  // namespace vorn

#endif  // VORN_LINUX_INI_FILE_H
