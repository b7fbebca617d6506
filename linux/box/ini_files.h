// The configuration of nfs-utils over all files that its programs read.
#ifndef VORN_LINUX_BOX_INI_FILES_H
#define VORN_LINUX_BOX_INI_FILES_H

#include <deque>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "box.h"
#include "ini_file.h"
#include "status.h"

namespace vorn {

// A setting that is in force, and where it comes from. Valid as long as the IniFiles object.
struct IniFound {
  std::string_view key;
  std::string_view value;   // a reference "$name" is resolved
  std::string_view stored;  // the value as it is in the file
  const IniFile* file = nullptr;
  int line = 0;

  std::string Where() const;  // "/etc/nfs.conf:3"
};

class IniFiles;
using SharedIniFiles = std::shared_ptr<const IniFiles>;

// One reading of "/etc/NAME.conf" and of "/etc/NAME.conf.d/*.conf" in the order of versionsort(3), each with the
// files that it includes: nfs.conf(5), and idmapd.conf(5), which libnfsidmap reads in the same way. The last value
// of a key counts. A file that is missing or not a regular file is skipped, as the readers do.
//
// A file that includes itself is read once more for each section that it can begin in, which gives the values of
// programs that read it to the end. They do not: see CheckReadable.
//
// "$name" refers to a key of the section [environment], whose value may be a reference again. The readers look for a
// variable of their own process first; its value is unknown here.
class IniFiles {
 public:
  // A text that takes the place of what is stored at `path`.
  struct Draft {
    std::string path;
    std::string text;
  };

  // The same object is returned while no file and not the list of files has changed; a draft is read each time.
  static Result<SharedIniFiles> Open(Box& box, const std::string& path,
                                     const std::optional<Draft>& draft = std::nullopt);

  // The setting in force; nullopt if the key has no value, or one that refers to nothing.
  std::optional<IniFound> Find(std::string_view section, std::string_view key) const;

  // The setting that decides over the key, also if its value refers to nothing. A reference is not resolved.
  std::optional<IniFound> FindStored(std::string_view section, std::string_view key) const;

  // The settings of a section that are in force, in the order in which they are read.
  std::vector<IniFound> Settings(std::string_view section) const;

  // The files that were read, in reading order; the first one is the main file. They live as long as this object.
  std::vector<const IniFile*> files() const;

  // The same files as owners. Two readings with equal lists have equal settings.
  std::vector<std::shared_ptr<const void>> sources() const;

  // Fails with kSyntax, naming file and line, if a program of nfs-utils cannot read the files to the end, so that
  // nothing is in force: a file includes itself, directly or through others, or a value refers to itself in this way.
  // Opening logs the same sentence once.
  const Status& CheckReadable() const { return readable_; }

  // Fails with kChangedBehind if the configuration context of this thread has first read another version of one of
  // the files, or another list of files.
  Status CheckUnchanged(Box& box) const;

  // To be called after the thread has written one of the files itself.
  static Status NoteOwnWrite(Box& box, const std::string& path);

 private:
  // The section that a file is included in: the lines before its first section header belong to it.
  struct Inherited {
    std::string name;  // lower case
    bool has_argument;

    bool operator==(const Inherited& other) const { return name == other.name && has_argument == other.has_argument; }
  };

  struct Source {
    std::string path;
    SharedIniFile file;
    std::optional<Inherited> inherited;  // nullopt: the reader ignores these lines
    std::vector<int> position;           // of the include lines that lead to the file; orders the sources
  };

  // A file whose lines are being read, and the one that includes it.
  struct Opened {
    const Source& source;
    const Opened* including;

    bool Has(const Source& other) const;
  };

  // Whether the lines of a file before its first section header are in [section], or in one with an argument that can
  // hide its values.
  static bool Inherits(const Source& source, std::string_view section);

  // Returns the value with its references replaced; nullopt if it refers to nothing, or to itself.
  struct Resolved {
    std::optional<std::string_view> value;
    bool is_circular = false;
  };

  static Result<IniFiles> Read(Box& box, const std::string& path, const std::optional<Draft>& draft);
  bool IsCurrent(Box& box) const;
  Status AddAll(Box& box, const std::string& path, const std::optional<Draft>& draft);
  Status Add(Box& box, Source source, const std::optional<Draft>& draft, const Opened* including = nullptr);
  Status AddIncludes(Box& box, const Opened& opened, const std::optional<Draft>& draft);
  void Reject(const Source& source, const Opened* including, const std::string& why);
  Resolved Resolve(std::string_view value) const;
  void CheckReferences();

  std::string folder_;
  Version names_;               // stands for the list of files in the folder
  std::deque<Source> sources_;  // a file that is being read stays where it is while others are added
  bool has_all_ = true;         // no file was skipped that may be read next time
  Status readable_;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_INI_FILES_H
