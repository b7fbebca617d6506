#include "hosts_text.h"

#include "lines.h"

namespace vorn {

std::vector<HostsLine> ReadHosts(const std::string& text) {
  std::vector<HostsLine> hosts;
  for (const std::string_view line : LinesOf(text)) {
    const std::vector<std::string_view> words = WordsOf(line.substr(0, line.find('#')));
    if (words.size() >= 2) hosts.push_back({std::string(words[0]), {words.begin() + 1, words.end()}});
  }
  return hosts;
}

}  // namespace vorn
