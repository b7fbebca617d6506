// A form. The parser gives the same events whether the form arrives in one piece, in two, or byte by byte.
#include "multipart.h"

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

namespace {

using vorn::server::MultipartParser;
using vorn::server::PartHead;

// Records all events in one string.
class Transcript : public vorn::server::PartReceiver {
 public:
  bool BeginPart(const PartHead& head) override {
    text += (head.is_file ? "<file " : "<text ") + head.name + ">";
    return true;
  }
  bool PartData(std::string_view data) override {
    text += data;
    return true;
  }
  bool EndPart() override {
    text += "<end>";
    return true;
  }
  std::string text;
};

// Returns the events of a form. The events before the end of an unfinished or malformed form depend on its pieces.
std::string Read(std::string_view form, std::size_t first, std::size_t rest) {
  Transcript transcript;
  MultipartParser parser("b", transcript);
  bool going_on = parser.Feed(form.substr(0, first));
  for (std::size_t at = first; going_on && at < form.size(); at += rest) going_on = parser.Feed(form.substr(at, rest));
  return parser.complete() ? transcript.text : "incomplete";
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view form(reinterpret_cast<const char*>(data), size);
  const std::string whole = Read(form, size, 1);
  if (Read(form, size / 2, size + 1) != whole || Read(form, 0, 1) != whole) std::abort();
  return 0;
}
