// The owner of an open file.
#ifndef VORN_LINUX_SYSTEM_FILE_DESCRIPTOR_H
#define VORN_LINUX_SYSTEM_FILE_DESCRIPTOR_H

#include <unistd.h>

#include <utility>

namespace vorn {

class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int number) : number_(number) {}
  ~FileDescriptor() { Close(); }
  FileDescriptor(FileDescriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    if (this == &other) return *this;
    Close();
    number_ = std::exchange(other.number_, -1);
    return *this;
  }

  // For open(2) and its like: negative where they failed.
  explicit operator bool() const { return number_ >= 0; }
  int get() const { return number_; }

  void Close() {
    if (number_ >= 0) close(std::exchange(number_, -1));
  }

 private:
  int number_ = -1;
};

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_FILE_DESCRIPTOR_H
