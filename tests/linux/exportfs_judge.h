// Asks the real exportfs(8) how it reads an exports file, in mount and network namespaces of its own
// (private_namespaces.h): nothing of this system is exported or changed.
#ifndef VORN_TESTS_LINUX_EXPORTFS_JUDGE_H
#define VORN_TESTS_LINUX_EXPORTFS_JUDGE_H

#include <string>
#include <vector>

namespace vorn {

struct ExportfsVerdict {
  int status = -1;       // of exportfs -r: 0 where it has nothing to complain of
  std::string table;     // its export table, etab
  std::string messages;  // what it wrote to its standard error
};

class ExportfsJudge {
 public:
  ExportfsJudge();
  ~ExportfsJudge();
  ExportfsJudge(const ExportfsJudge&) = delete;
  ExportfsJudge& operator=(const ExportfsJudge&) = delete;

  // Why exportfs cannot be asked here; empty when it can.
  std::string Unavailable() const;

  // One verdict for each file. The resolver knows `hosts` and no other name; there are the folders
  // "a", "b", "c", "a b" and "b# " in /mnt.
  std::vector<ExportfsVerdict> Judge(const std::vector<std::string>& files,
                                     const std::vector<std::string>& hosts = {}) const;

 private:
  std::string folder_;
};

}  // namespace vorn

#endif  // VORN_TESTS_LINUX_EXPORTFS_JUDGE_H
