// The limits of a form, checked while it arrives.
#ifndef VORN_SERVER_FORM_CHECK_H
#define VORN_SERVER_FORM_CHECK_H

#include <cstddef>
#include <optional>
#include <set>
#include <string>
#include <string_view>

#include "http.h"
#include "multipart.h"

namespace vorn::server {

// Checks a form completely, except for the content of its text parts, before any of it is stored. Used by
// the network thread: a piece costs time in proportion to its size, and no more than kMaxParts heads are read.
class FormCheck : private PartReceiver {
 public:
  static constexpr std::size_t kMaxParts = 8;
  static constexpr std::size_t kMaxFileBytes = std::size_t{1024} * 1024;
  static constexpr std::size_t kMaxTextBytes = std::size_t{64} * 1024;

  explicit FormCheck(const std::string& boundary) : parser_(boundary, *this) {}

  // Takes the next piece. A response refuses the form.
  std::optional<Response> Feed(std::string_view piece);

  // Whether the closing boundary has been received.
  bool complete() const { return parser_.complete(); }

 private:
  bool BeginPart(const PartHead& head) override;
  bool PartData(std::string_view data) override;
  bool EndPart() override { return true; }
  bool Refuse(int status, const std::string& text);

  MultipartParser parser_;
  PartHead part_;
  std::size_t part_bytes_ = 0;
  std::size_t parts_ = 0;
  std::set<std::string> parameters_;  // the names that parts have set
  std::optional<Response> refusal_;
};

// The name of the parameter that a part sets.
std::string ParameterOf(const PartHead& part);

}  // namespace vorn::server

#endif  // VORN_SERVER_FORM_CHECK_H
