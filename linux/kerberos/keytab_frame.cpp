#include "keytab_frame.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

namespace vorn {
namespace {

// The two versions of the format. The first one has numbers in the byte order of the machine that wrote it, counts
// the realm among the components of a principal, and has no type of principal.
constexpr std::string_view kVersion1("\x05\x01", 2);
constexpr std::string_view kVersion2("\x05\x02", 2);

bool IsLittleEndian() {
  const std::uint16_t one = 1;
  unsigned char first = 0;
  std::memcpy(&first, &one, 1);
  return first == 1;
}

// Takes fields from the beginning of the bytes. Once a field is incomplete, no further field is taken.
class Fields {
 public:
  Fields(std::string_view bytes, bool little_endian) : rest_(bytes), little_endian_(little_endian) {}

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
    unsigned shift = 0;
    for (const char byte : Take(size)) {
      const std::uint32_t value = static_cast<unsigned char>(byte);
      number = little_endian_ ? number | value << shift : number << 8 | value;
      shift += 8;
    }
    return number;
  }

  // Whether the next number of four bytes would be 0, as far as it is there.
  bool StartsWithZeros() const { return rest_.substr(0, 4).find_first_not_of('\0') == std::string_view::npos; }

  // Whether only zeros are left.
  bool IsPadding() const { return rest_.find_first_not_of('\0') == std::string_view::npos; }

  // A string or a key, preceded by its length, which libkrb5 reads as a signed number.
  std::string_view Counted() {
    const std::uint32_t size = Number(2);
    good_ = good_ && size <= INT16_MAX;
    return Take(size);
  }

 private:
  std::string_view rest_;
  bool little_endian_;
  bool good_ = true;
};

// Validates an entry: a principal (components, realm, type), a time, a version, a key, and what later versions of the
// format added. Strings and the key must not be empty: libkrb5 mistakes an empty one for the end of the file and leaks
// what it has read of the entry.
bool IsEntry(std::string_view bytes, bool is_version1) {
  Fields fields(bytes, is_version1 && IsLittleEndian());
  const std::uint32_t counted = fields.Number(2);
  const std::uint32_t components = is_version1 && counted > 0 ? counted - 1 : counted;
  bool has_texts = !fields.Counted().empty();
  for (std::uint32_t i = 0; i < components && has_texts; ++i) has_texts = !fields.Counted().empty();
  constexpr std::size_t kType = 4;
  constexpr std::size_t kTimeVersionAndKeyType = 4 + 1 + 2;
  fields.Take(kTimeVersionAndKeyType + (is_version1 ? 0 : kType));
  const bool has_key = !fields.Counted().empty();
  return components > 0 && counted <= INT16_MAX && has_texts && has_key;
}

}  // namespace

Status NoKeytab(const std::string& why) { return Status::Failure(kNoKeytab, "not a keytab: " + why); }

Result<std::size_t> CountKeytabEntries(std::string_view content) {
  const std::string_view version = content.substr(0, kVersion2.size());
  const bool is_version1 = version == kVersion1;
  if (!is_version1 && version != kVersion2) return NoKeytab("it does not begin as one");
  Fields fields(content.substr(version.size()), is_version1 && IsLittleEndian());
  std::size_t count = 0;
  while (!fields.at_end()) {
    if (fields.StartsWithZeros() && fields.IsPadding()) break;
    const auto size = static_cast<std::int32_t>(fields.Number(4));
    // A negative size is a hole, left by an entry that was removed.
    const std::string_view entry = fields.Take(static_cast<std::size_t>(std::abs(std::int64_t{size})));
    if (size == 0 || !fields.good()) return NoKeytab("the last entry is cut off");
    if (size < 0) continue;
    ++count;
    if (!IsEntry(entry, is_version1)) return NoKeytab("entry " + std::to_string(count) + " is damaged");
  }
  return count;
}

}  // namespace vorn
