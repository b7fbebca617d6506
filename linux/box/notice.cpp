#include "notice.h"

#include <syslog.h>

#include <map>
#include <mutex>
#include <utility>

#include "call.h"
#include "call_rights.h"

namespace vorn {
namespace {

// One line of the log: the sentence may quote what a file says.
std::string OnOneLine(std::string text) {
  for (char& c : text) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7f') c = '?';
  }
  return text;
}

void Warn(const std::string& sentence) {
  if (VORN::CallContext* call = VORN::CallContext::Current()) call->AddWarning(OnOneLine(sentence));
}

// Whether the sentence has not been logged for this version of the file. Remembers a bounded number of sentences;
// afterwards it forgets them all, and a remark is repeated.
bool IsNew(const std::string& location, const Version& version, const std::string& sentence) {
  constexpr std::size_t kMostSentences = 1000;
  static std::mutex mutex;
  static auto* logged = new std::map<std::pair<std::string, std::string>, Version>;
  const std::lock_guard lock(mutex);
  if (logged->size() >= kMostSentences) logged->clear();
  const auto [found, is_new] = logged->try_emplace({location, sentence}, version);
  return is_new || std::exchange(found->second, version) != version;
}

}  // namespace

void LogDone(int priority, const std::string& sentence) {
  if (!IsRehearsal()) syslog(priority, "%s", OnOneLine(sentence).c_str());
}

void Notice(const std::string& sentence) {
  LogDone(LOG_WARNING, sentence);
  Warn(sentence);
}

void NoticeOnce(const std::string& location, const Version& version, const std::string& sentence) {
  // A rehearsal must not make the sentence count as logged.
  if (!IsRehearsal() && IsNew(location, version, sentence)) LogDone(LOG_WARNING, sentence);
  Warn(sentence);
}

}  // namespace vorn
