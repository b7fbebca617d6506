#include "keytab_frame.h"

#include <cstdint>
#include <cstdlib>

namespace vorn {
namespace {

constexpr std::string_view kVersion("\x05\x02", 2);

// Takes fields, numbers big-endian; once one is not there, nothing is.
class Fields {
 public:
  explicit Fields(std::string_view bytes) : rest_(bytes) {}

  bool good() const { return good_; }
  bool at_end() const { return rest_.empty(); }

  std::string_view Take(std::size_t size) {
    good_ = good_ && size <= rest_.size();
    if (!good_) return {};
    const std::string_view field = rest_.substr(0, size);
    rest_.remove_prefix(size);
    return field;
  }

  std::uint32_t Number(std::size_t size) {
    std::uint32_t number = 0;
    for (const char byte : Take(size)) number = number << 8 | static_cast<unsigned char>(byte);
    return number;
  }

  // A text or a key behind its length, which libkrb5 takes for a signed number.
  std::string_view Counted() {
    const std::uint32_t size = Number(2);
    good_ = good_ && size <= INT16_MAX;
    return Take(size);
  }

 private:
  std::string_view rest_;
  bool good_ = true;
};

// A principal (components, realm, type), a time, a version, a key, and what later versions of the format added.
// Texts and the key are not empty: libkrb5 takes one that is for the file's end, and loses what it has read of the
// entry.
bool IsEntry(std::string_view bytes) {
  Fields fields(bytes);
  const std::uint32_t components = fields.Number(2);
  bool has_texts = !fields.Counted().empty();
  for (std::uint32_t i = 0; i < components && has_texts; ++i) has_texts = !fields.Counted().empty();
  constexpr std::size_t kTypeTimeVersionAndKeyType = 4 + 4 + 1 + 2;
  fields.Take(kTypeTimeVersionAndKeyType);
  const bool has_key = !fields.Counted().empty();
  return components > 0 && components <= INT16_MAX && has_texts && has_key;
}

}  // namespace

Status NoKeytab(const std::string& why) { return Status::Failure(kNoKeytab, "not a keytab: " + why); }

Result<std::size_t> CountKeytabEntries(std::string_view content) {
  Fields fields(content);
  if (fields.Take(kVersion.size()) != kVersion) return NoKeytab("it does not begin as one");
  std::size_t count = 0;
  while (!fields.at_end()) {
    const auto size = static_cast<std::int32_t>(fields.Number(4));
    // A negative size is a hole, left by an entry that was removed.
    const std::string_view entry = fields.Take(static_cast<std::size_t>(std::abs(std::int64_t{size})));
    if (size == 0 || !fields.good()) return NoKeytab("the last entry is cut off");
    if (size < 0) continue;
    ++count;
    if (!IsEntry(entry)) return NoKeytab("entry " + std::to_string(count) + " is damaged");
  }
  return count;
}

}  // namespace vorn
