#include "client_states.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <unordered_set>

#include "lines.h"

namespace vorn {
namespace {

constexpr std::string_view kBegin = "- 0x";
constexpr std::string_view kType = ": { type: ";
constexpr std::size_t kGenerationDigits = 8;
constexpr std::size_t kIDDigits = 24;  // of a state, behind its generation

constexpr char kDigits[] = "0123456789abcdef";

bool IsDigit(char c) { return std::memchr(kDigits, c, sizeof kDigits - 1) != nullptr; }

// The first digits of the state ids of a client: the bytes of its id as the memory has them. Empty if it has none.
std::string StatePrefix(const std::string& client_id) {
  char* end = nullptr;
  const std::uint64_t id = std::strtoull(client_id.c_str(), &end, 16);
  if (client_id.empty() || *end != '\0') return "";
  unsigned char bytes[sizeof id];
  std::memcpy(bytes, &id, sizeof id);
  std::string digits;
  for (const unsigned char byte : bytes) {
    digits.push_back(kDigits[byte >> 4]);
    digits.push_back(kDigits[byte & 15]);
  }
  return digits;
}

// One line, up to the name of its file:
// - 0x01000000ba3f5a660b5c7a2e02000000: { type: open, access: rw, deny: --, superblock: "62:00:12", filename: "a/b",
// ...
struct State {
  std::string_view id;  // empty: the line is none of a state
  std::string_view type;
  std::string_view file;  // device and inode; empty if the kernel does not show them
};

State ParseState(std::string_view line) {
  State state;
  const std::size_t type_at = kBegin.size() + kGenerationDigits + kIDDigits;
  if (line.substr(0, kBegin.size()) != kBegin || line.substr(std::min(type_at, line.size()), kType.size()) != kType) {
    return state;
  }
  const std::string_view digits = line.substr(kBegin.size(), kGenerationDigits + kIDDigits);
  if (!std::all_of(digits.begin(), digits.end(), IsDigit)) return state;
  state.id = digits.substr(kGenerationDigits);
  line.remove_prefix(type_at + kType.size());
  state.type = line.substr(0, line.find_first_of(", "));
  line = line.substr(0, line.find("filename: "));
  constexpr std::string_view kFile = "superblock: \"";
  const std::size_t file = line.find(kFile);
  if (file == std::string_view::npos) return state;
  line.remove_prefix(file + kFile.size());
  state.file = line.substr(0, line.find('"'));
  return state;
}

}  // namespace

ClientStates CountClientStates(std::string_view text, const std::string& client_id) {
  const std::string prefix = StatePrefix(client_id);
  std::unordered_set<std::string_view> ids;
  std::unordered_set<std::string_view> files;
  ClientStates states;
  for (const std::string_view line : LinesOf(text)) {
    const State state = ParseState(line);
    if (state.id.empty() || state.id.substr(0, prefix.size()) != prefix || !ids.insert(state.id).second) continue;
    if (state.type == "open") files.insert(state.file.empty() ? state.id : state.file);
    if (state.type == "lock") ++states.locks;
    if (state.type == "deleg") ++states.delegations;
  }
  states.open_files = files.size();
  return states;
}

}  // namespace vorn
