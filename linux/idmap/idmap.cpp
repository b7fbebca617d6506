#include "idmap.h"

#include <algorithm>
#include <mutex>
#include <unordered_set>
#include <utility>

#include "notice.h"
#include "translation_methods.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr char kReplacement[] = "\xef\xbf\xbd";

// Shows each principal under a string of its own. Principals that are valid UTF-8 are shown as they are.
std::shared_ptr<const TextPairs> Shown(const std::vector<IniFound>& stored) {
  std::vector<TextPairs::Pair> pairs;
  pairs.reserve(stored.size());
  std::vector<std::size_t> repaired;
  for (const IniFound& mapping : stored) {
    if (!IsValidUtf8(mapping.key)) repaired.push_back(pairs.size());
    pairs.emplace_back(ToValidUtf8(mapping.key), ToValidUtf8(mapping.value));
  }
  if (!repaired.empty()) {
    std::unordered_set<std::string> taken;
    for (const IniFound& mapping : stored) taken.emplace(mapping.key);
    for (const std::size_t at : repaired) {
      while (!taken.insert(pairs[at].first).second) pairs[at].first += kReplacement;
    }
  }
  return std::make_shared<const TextPairs>(std::move(pairs));
}

}  // namespace

// A search over all mappings at once: their strings in upper case, one below the other.
class IDMap::Search {
 public:
  std::shared_ptr<const TextPairs> Find(const TextPairs& mappings, std::string_view filter) {
    const std::lock_guard lock(mutex_);
    if (last_result_ != nullptr && last_filter_ == filter) return last_result_;
    if (ends_.size() != mappings.size()) Prepare(mappings);
    last_result_ = Matching(mappings, UpperCaseOrSame(filter));
    last_filter_ = filter;
    return last_result_;
  }

 private:
  void Prepare(const TextPairs& mappings) {
    for (const auto& [principal, local_name] : mappings.pairs()) {
      text_ += UpperCaseOrSame(principal) + "\n" + UpperCaseOrSame(local_name) + "\n";
      ends_.push_back(text_.size());
    }
  }

  std::shared_ptr<const TextPairs> Matching(const TextPairs& mappings, const std::string& filter) const {
    std::vector<TextPairs::Pair> found;
    const bool can_match = filter.find('\n') == std::string::npos;  // no mapping has a line feed
    for (std::size_t at = 0; can_match && (at = text_.find(filter, at)) != std::string::npos && at < text_.size();) {
      const auto end = std::upper_bound(ends_.begin(), ends_.end(), at);
      found.push_back(mappings.pairs()[static_cast<std::size_t>(end - ends_.begin())]);
      at = *end;
    }
    return std::make_shared<const TextPairs>(std::move(found));
  }

  std::mutex mutex_;
  std::string text_;
  std::vector<std::size_t> ends_;  // of each mapping in text_
  std::string last_filter_;
  std::shared_ptr<const TextPairs> last_result_;
};

IDMap::IDMap(SharedIniFiles files)
    : files_(std::move(files)),
      stored_(files_->Settings("Static")),
      mappings_(Shown(stored_)),
      search_(std::make_shared<Search>()) {
  const std::optional<IniFound> domain = files_->Find("General", "Domain");
  if (domain) domain_ = ToValidUtf8(domain->value);
}

std::shared_ptr<const TextPairs> IDMap::Matching(std::string_view filter) const {
  return filter.empty() ? mappings_ : search_->Find(*mappings_, filter);
}

Result<std::shared_ptr<const IDMap>> ReadIDMap(Box& box, const std::string& path) {
  const Result<SharedIniFiles> files = IniFiles::Open(box, path);
  if (!files.ok()) return files.status();
  return box.Derive<IDMap>(path, (*files)->sources(), [&]() -> Result<IDMap> {
    for (const std::string& sentence : MissingPlugins(box, **files)) Notice(sentence);
    return IDMap(*files);
  });
}

}  // namespace vorn
