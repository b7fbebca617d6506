#include "kernel_cache.h"

#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <fstream>
#include <sstream>

#include "file_descriptor.h"
#include "files.h"

namespace vorn {
namespace {

bool IsOctal(char c) { return c >= '0' && c <= '7'; }

}  // namespace

std::optional<std::vector<KernelCache::Entry>> KernelCache::Entries() const {
  std::ifstream content(folder_ + "/content");
  if (!content) return std::nullopt;
  std::vector<Entry> entries;
  for (std::string line; std::getline(content, line);) {
    Entry entry;
    entry.is_negative = line.substr(0, 2) == "# ";
    std::istringstream text(entry.is_negative ? line.substr(2) : line);
    for (std::string word; text >> word;) entry.words.push_back(word);
    const bool is_header = entry.words.empty() || entry.words[0][0] == '#';
    if (!is_header) entries.push_back(std::move(entry));
  }
  return entries;
}

Status KernelCache::Write(const std::vector<std::string>& lines) const {
  if (lines.empty()) return {};
  return WriteToChannel(lines).ok() ? Status() : Flush();
}

Status KernelCache::WriteToChannel(const std::vector<std::string>& lines) const {
  const std::string path = folder_ + "/channel";
  const FileDescriptor channel(open(path.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC));
  if (!channel) return Status::System(errno, path);
  for (const std::string& line : lines) {
    Status status = WriteAll(channel.get(), line + "\n", path);
    if (!status.ok() && status.code() != ENOENT) return status;
  }
  return {};
}

Status KernelCache::Flush() const {
  const std::string path = folder_ + "/flush";
  const FileDescriptor flush(open(path.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC));
  return flush ? WriteAll(flush.get(), std::to_string(std::time(nullptr)) + "\n", path) : Status::System(errno, path);
}

std::string UnescapeWord(const std::string& word) {
  std::string text;
  for (std::size_t i = 0; i < word.size(); ++i) {
    const bool is_escape = word[i] == '\\' && word.size() - i > 3 && std::all_of(&word[i + 1], &word[i + 4], IsOctal);
    if (is_escape) {
      text.push_back(static_cast<char>(std::stoi(word.substr(i + 1, 3), nullptr, 8)));
      i += 3;
    } else {
      text.push_back(word[i]);
    }
  }
  return text;
}

}  // namespace vorn
