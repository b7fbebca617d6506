// An incremental parser of multipart/form-data (RFC 7578).
#ifndef VORN_SERVER_MULTIPART_H
#define VORN_SERVER_MULTIPART_H

#include <cstddef>
#include <string>
#include <string_view>

namespace vorn::server {

// The head of one part.
struct PartHead {
  std::string name;
  bool is_file = false;  // it has a file name, or a type that is not text/plain
};

// Receives the parts in order: BeginPart, any number of PartData, and EndPart for each. Returning false stops
// the parser; the receiver then has the reason.
class PartReceiver {
 public:
  virtual ~PartReceiver() = default;
  virtual bool BeginPart(const PartHead& head) = 0;
  virtual bool PartData(std::string_view data) = 0;
  virtual bool EndPart() = 0;
};

class MultipartParser {
 public:
  static constexpr std::size_t kMaxHeadBytes = 4096;  // of one part

  // `boundary` as the Content-Type gives it. The receiver must outlive this.
  MultipartParser(const std::string& boundary, PartReceiver& receiver);

  // Returns whether the boundary is valid (RFC 2046, 5.1.1).
  static bool IsBoundary(std::string_view boundary);

  // Parses the next piece. Buffers only data that could be a boundary or the head of a part. Returns
  // false once the receiver has stopped it or error() is set.
  bool Feed(std::string_view piece);

  bool complete() const { return state_ == State::kEpilogue; }  // the closing boundary has come
  const std::string& error() const { return error_; }           // empty unless the text is malformed

 private:
  enum class State { kPreamble, kBoundary, kHead, kData, kEpilogue, kStopped };
  enum class Step { kDone, kNeedMore, kStop };

  Step Advance();
  Step SkipPreamble();
  Step EndBoundary();
  Step ReadHead();
  Step ReadData();
  Step Malformed(const char* what);
  Step Ask(bool go_on, State next);
  void Consume(std::size_t count) { pending_.remove_prefix(count); }
  Step BoundaryBefore(std::string_view* text);

  const std::string delimiter_;
  PartReceiver& receiver_;
  State state_ = State::kPreamble;
  std::string buffer_{"\r\n"};  // the first boundary may be at the very beginning
  std::string_view pending_;    // the unread part of the buffer, during Feed
  std::string error_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_MULTIPART_H
