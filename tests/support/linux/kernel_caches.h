// Empty files in place of the export caches of the kernel's server, /proc/net/rpc.
#ifndef VORN_TESTS_SUPPORT_LINUX_KERNEL_CACHES_H
#define VORN_TESTS_SUPPORT_LINUX_KERNEL_CACHES_H

#include <string>

#include "temporary_root.h"

// Each cache ("auth.unix.ip", "nfsd.export", "nfsd.fh") has the files "content", "channel" and "flush", as in the
// kernel. What is written to the last two stays in them. The root must outlive the object.
class KernelCaches {
 public:
  explicit KernelCaches(const TemporaryRoot& root) : root_(root) {
    for (const char* cache : {"auth.unix.ip", "nfsd.export", "nfsd.fh"}) Fill(cache, "");
  }

  // The folder of the caches.
  std::string folder() const { return root_.At(kFolder); }

  // Gives a cache these entries. Nothing has been written to its channel and its flush file then.
  void Fill(const std::string& cache, const std::string& content) const {
    Write(cache, "content", content);
    Write(cache, "channel", "");
    Write(cache, "flush", "");
  }

  void Write(const std::string& cache, const std::string& file, const std::string& text) const {
    root_.Write(Path(cache, file), text);
  }

  // Returns the lines that were written to the channel: the entries that the kernel is to forget.
  std::string Channel(const std::string& cache) const { return root_.Read(Path(cache, "channel")).value_or(""); }

  bool IsFlushed(const std::string& cache) const { return !root_.Read(Path(cache, "flush")).value_or("").empty(); }

 private:
  static constexpr char kFolder[] = "/proc/net/rpc";

  static std::string Path(const std::string& cache, const std::string& file) {
    return std::string(kFolder) + "/" + cache + "/" + file;
  }

  const TemporaryRoot& root_;
};

#endif  // VORN_TESTS_SUPPORT_LINUX_KERNEL_CACHES_H
