#include "multipart.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "header_value.h"

namespace vorn::server {
namespace {

constexpr std::string_view kLineBreak = "\r\n";
constexpr std::string_view kBoundaryMarks = "'()+_,-./:=? ";

// Parses the header lines of a part. Returns std::nullopt if they do not describe a part of a form.
std::optional<PartHead> ParsePartHead(std::string_view lines) {
  std::optional<HeaderValue> disposition;
  std::string type = "text/plain";
  while (!lines.empty()) {
    const std::size_t end = std::min(lines.find(kLineBreak), lines.size());
    const std::string_view line = lines.substr(0, end);
    const std::size_t colon = line.find(':');
    if (colon == std::string_view::npos) return std::nullopt;
    const std::string name = LowerAscii(line.substr(0, colon));
    const auto value = ParseHeaderValue(line.substr(colon + 1));
    if (name == "content-disposition" && (disposition || !value)) return std::nullopt;
    if (name == "content-disposition") disposition = value;
    if (name == "content-type") type = value ? value->value : "";
    lines.remove_prefix(std::min(end + kLineBreak.size(), lines.size()));
  }
  if (!disposition || disposition->value != "form-data") return std::nullopt;
  const auto name = disposition->parameters.find("name");
  if (name == disposition->parameters.end() || name->second.empty()) return std::nullopt;
  return PartHead{name->second, disposition->parameters.count("filename") != 0 || type != "text/plain"};
}

}  // namespace

MultipartParser::MultipartParser(const std::string& boundary, PartReceiver& receiver)
    : delimiter_("\r\n--" + boundary), receiver_(receiver) {}

bool MultipartParser::IsBoundary(std::string_view boundary) {
  const auto fits = [](char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
           kBoundaryMarks.find(c) != std::string_view::npos;
  };
  return !boundary.empty() && boundary.size() <= 70 && boundary.back() != ' ' &&
         std::all_of(boundary.begin(), boundary.end(), fits);
}

bool MultipartParser::Feed(std::string_view piece) {
  if (state_ == State::kStopped) return false;
  buffer_ += piece;
  pending_ = buffer_;
  Step step = Step::kDone;
  while (step == Step::kDone) step = Advance();
  buffer_.erase(0, buffer_.size() - pending_.size());
  if (step == Step::kStop) state_ = State::kStopped;
  return step != Step::kStop;
}

MultipartParser::Step MultipartParser::Advance() {
  switch (state_) {
    case State::kPreamble:
      return SkipPreamble();
    case State::kBoundary:
      return EndBoundary();
    case State::kHead:
      return ReadHead();
    case State::kData:
      return ReadData();
    case State::kEpilogue:
      Consume(pending_.size());
      return Step::kNeedMore;
    case State::kStopped:
      break;
  }
  return Step::kStop;
}

// Consumes the data before the next boundary, and the boundary (kDone), or all data that cannot begin a
// boundary (kNeedMore). Stores the data before the boundary in `text`.
MultipartParser::Step MultipartParser::BoundaryBefore(std::string_view* text) {
  const std::size_t found = pending_.find(delimiter_);
  if (found != std::string_view::npos) {
    *text = pending_.substr(0, found);
    Consume(found + delimiter_.size());
    return Step::kDone;
  }
  const std::size_t kept = std::min(pending_.size(), delimiter_.size() - 1);
  *text = pending_.substr(0, pending_.size() - kept);
  Consume(text->size());
  return Step::kNeedMore;
}

MultipartParser::Step MultipartParser::SkipPreamble() {
  std::string_view ignored;
  const Step step = BoundaryBefore(&ignored);
  if (step == Step::kDone) state_ = State::kBoundary;
  return step;
}

// Reads the rest of a boundary line: two hyphens after the closing boundary, otherwise blanks and the line break.
MultipartParser::Step MultipartParser::EndBoundary() {
  if (pending_.size() < 2) return Step::kNeedMore;
  if (pending_.substr(0, 2) == "--") {
    state_ = State::kEpilogue;
    return Step::kDone;
  }
  const std::size_t blanks = std::min(pending_.find_first_not_of(" \t"), pending_.size());
  if (blanks > kMaxHeadBytes) return Malformed("a boundary has no end");
  if (pending_.size() < blanks + 2) return Step::kNeedMore;
  if (pending_.substr(blanks, 2) != kLineBreak) return Malformed("a boundary is followed by something else");
  Consume(blanks);  // the line break stays: with it, a head without lines ends like every other
  state_ = State::kHead;
  return Step::kDone;
}

MultipartParser::Step MultipartParser::ReadHead() {
  static constexpr std::string_view kEnd = "\r\n\r\n";
  const std::size_t end = pending_.find(kEnd);
  if (std::min(end, pending_.size()) > kMaxHeadBytes) return Malformed("the head of a part is too long");
  if (end == std::string_view::npos) return Step::kNeedMore;
  const std::optional<PartHead> head =
      end == 0 ? std::nullopt : ParsePartHead(pending_.substr(kLineBreak.size(), end - kLineBreak.size()));
  if (!head) return Malformed("a part has no proper Content-Disposition: form-data with a name");
  Consume(end + kEnd.size());
  return Ask(receiver_.BeginPart(*head), State::kData);
}

MultipartParser::Step MultipartParser::ReadData() {
  std::string_view data;
  const Step step = BoundaryBefore(&data);
  if (!data.empty() && !receiver_.PartData(data)) return Step::kStop;
  return step == Step::kNeedMore ? step : Ask(receiver_.EndPart(), State::kBoundary);
}

MultipartParser::Step MultipartParser::Malformed(const char* what) {
  error_ = what;
  return Step::kStop;
}

MultipartParser::Step MultipartParser::Ask(bool go_on, State next) {
  state_ = next;
  return go_on ? Step::kDone : Step::kStop;
}

}  // namespace vorn::server
