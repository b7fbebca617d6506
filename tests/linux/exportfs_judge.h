// Runs the real exportfs(8) on exports files in mount and network namespaces of its own (private_namespaces.h):
// nothing of this system is exported or changed.
#ifndef VORN_TESTS_LINUX_EXPORTFS_JUDGE_H
#define VORN_TESTS_LINUX_EXPORTFS_JUDGE_H

#include <map>
#include <string>
#include <vector>

namespace vorn {

struct ExportfsVerdict {
  int status = -1;       // the exit status of exportfs -r: 0 if it found no fault
  std::string table;     // its export table, etab
  std::string messages;  // its standard error
};

// All files of exports(5) of one box.
struct ExportsSet {
  std::string file;                            // /etc/exports
  std::map<std::string, std::string> foreign;  // the files of /etc/exports.d by name
};

class ExportfsJudge {
 public:
  ExportfsJudge();
  ~ExportfsJudge();
  ExportfsJudge(const ExportfsJudge&) = delete;
  ExportfsJudge& operator=(const ExportfsJudge&) = delete;

  // Returns why exportfs cannot be run here; empty if it can.
  std::string Unavailable() const;

  // Returns one verdict for each file. The resolver knows `hosts` and no other name. /mnt has the folders "a",
  // "b", "c", "a b" and "b# ".
  std::vector<ExportfsVerdict> Judge(const std::vector<std::string>& files,
                                     const std::vector<std::string>& hosts = {}) const;

  // Returns one verdict for each set of files. `hosts` is the text of hosts(5); /mnt is the folder `mnt`.
  std::vector<ExportfsVerdict> JudgeSets(const std::vector<ExportsSet>& sets, const std::string& hosts,
                                         const std::string& mnt) const;

 private:
  std::vector<ExportfsVerdict> Run(const std::vector<ExportsSet>& sets, const std::string& hosts,
                                   const std::string& mnt) const;

  std::string folder_;
};

}  // namespace vorn

#endif  // VORN_TESTS_LINUX_EXPORTFS_JUDGE_H
