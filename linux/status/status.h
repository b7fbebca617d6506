// Failures as values: a code, the place in the source that noticed the failure, and a sentence for the log.
// No function of linux/ throws for a failure of the system or of its input.
#ifndef VORN_LINUX_STATUS_STATUS_H
#define VORN_LINUX_STATUS_STATUS_H

#include <cstring>
#include <optional>
#include <string>
#include <utility>

namespace vorn {

// Codes of the platform's own, beside those of errno(3).
enum ErrorCode : int {
  kRefusedText = 0x1001,     // a text that the file's syntax cannot represent
  kSyntax = 0x1002,          // a file that cannot be understood
  kChangedBehind = 0x1003,   // another writer changed the file between read and write
  kServiceFailed = 0x1004,   // the service did not reach the requested state
  kProgramFailed = 0x1005,   // a program exited with a failure
  kUnknownService = 0x1006,  // there is no such service
  kNoKeytab = 0x1007,        // the file is not a keytab
  kUnsupported = 0x1008,     // this box cannot do it
  kLockTimeout = 0x1009,     // another process kept a lock for too long
  kOverridden = 0x100a,      // another file decides over the value
  kNoSuchUser = 0x100b,      // the box has no such user
  kNoSuchGroup = 0x100c,     // the box has no such group
};

// The outcome of an operation: success, or a failure with an ErrorCode or an errno(3) value.
class [[nodiscard]] Status {
 public:
  Status() = default;

  static Status Failure(int code, std::string reason, const char* file = __builtin_FILE(),
                        int line = __builtin_LINE()) {
    Status status;
    status.code_ = code;
    status.reason_ = std::move(reason);
    status.file_ = file;
    status.line_ = line;
    return status;
  }

  // The failure of a system call: the reason is `what`, followed by the system's text for `error_number`.
  static Status System(int error_number, const std::string& what, const char* file = __builtin_FILE(),
                       int line = __builtin_LINE()) {
    return Failure(error_number, what + ": " + std::strerror(error_number), file, line);
  }

  bool ok() const { return code_ == 0; }
  int code() const { return code_; }
  const std::string& reason() const { return reason_; }
  const char* file() const { return file_; }
  int line() const { return line_; }

 private:
  int code_ = 0;
  std::string reason_;
  const char* file_ = "";
  int line_ = 0;
};

// A value, or the failure that prevented it. The value may only be used if ok().
template <typename T>
class [[nodiscard]] Result {
 public:
  Result(T value) : value_(std::move(value)) {}            // NOLINT(google-explicit-constructor)
  Result(Status failure) : status_(std::move(failure)) {}  // NOLINT(google-explicit-constructor)

  bool ok() const { return value_.has_value(); }
  const Status& status() const { return status_; }
  T& operator*() { return *value_; }
  const T& operator*() const { return *value_; }
  T* operator->() { return &*value_; }
  const T* operator->() const { return &*value_; }

 private:
  std::optional<T> value_;
  Status status_;
};

}  // namespace vorn

#endif  // VORN_LINUX_STATUS_STATUS_H
