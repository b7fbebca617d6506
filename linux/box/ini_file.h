// The INI files of a box: a shared, immutable view for readers, and an editor for writers.
#ifndef VORN_LINUX_BOX_INI_FILE_H
#define VORN_LINUX_BOX_INI_FILE_H

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "box.h"
#include "ini_document.h"
#include "status.h"

namespace vorn {

class IniFile;

// A file as one version of it was read. Any number of threads may share it.
using SharedIniFile = std::shared_ptr<const IniFile>;

class IniFile {
 public:
  // The file at the box's `path`. A file that does not exist reads as an empty one.
  static Result<SharedIniFile> Open(Box& box, const std::string& path);

  // A file that has not been written yet. Its version is that of a missing file.
  static SharedIniFile FromText(std::string location, std::string_view text);

  bool exists() const { return version_.exists; }
  const std::string& location() const { return location_; }  // its path on this system, for messages
  const Version& version() const { return version_; }
  const IniDocument& document() const { return document_; }

  // A kSyntax failure that names the line of a key and says what is wrong with its value.
  Status Refuse(std::string_view section, std::string_view key, const std::string& why) const;

 private:
  friend class IniEditor;

  IniFile(std::string location, Version version, IniDocument document)
      : location_(std::move(location)), version_(version), document_(std::move(document)) {}

  static Result<IniFile> Parse(StoredFile file);

  std::string location_;
  Version version_;
  IniDocument document_;
};

// Changes one file. The calling thread owns the configuration lock while the object lives.
class IniEditor {
 public:
  // A file that does not exist is created by Save, and begins with `heading`.
  static Result<IniEditor> Open(Box& box, const std::string& path, std::string_view heading = {});

  const std::string& location() const { return location_; }
  IniDocument& document() { return document_; }

  // Writes the document if it differs from the file; else completes an interrupted write of the same text.
  Status Save();

 private:
  IniEditor(Box& box, std::string path, std::string location, std::string text, Version version, IniDocument document)
      : box_(&box),
        path_(std::move(path)),
        location_(std::move(location)),
        text_(std::move(text)),
        version_(version),
        document_(std::move(document)) {}

  Box* box_;
  std::string path_;
  std::string location_;
  std::string text_;  // of the file, or the heading of a new one
  Version version_;
  IniDocument document_;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_INI_FILE_H
