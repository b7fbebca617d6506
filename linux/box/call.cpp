#include "call.h"

#include <algorithm>
#include <utility>

#include "unicode.h"

namespace VORN {
namespace {

constexpr std::size_t kMostSentences = 32;
constexpr std::size_t kLongestSentence = 1024;

thread_local CallContext* current = nullptr;

// Cuts at the start of a UTF-8 character.
void Shorten(std::string* sentence) {
  if (sentence->size() <= kLongestSentence) return;
  std::size_t end = kLongestSentence;
  while (end > 0 && (static_cast<unsigned char>((*sentence)[end]) & 0xC0U) == 0x80U) --end;
  sentence->resize(end);
}

void Add(std::string sentence, std::vector<std::string>* sentences) {
  Shorten(&sentence);
  if (sentences->size() >= kMostSentences) return;
  if (std::find(sentences->begin(), sentences->end(), sentence) != sentences->end()) return;
  sentences->push_back(std::move(sentence));
}

}  // namespace

CallContext::CallContext(CallDescription description)
    : description_(std::move(description)), outer_(std::exchange(current, this)) {}

CallContext::~CallContext() {
  End();
  current = outer_;
}

void CallContext::End() noexcept {
  has_ended_ = true;
  for (const std::function<void()>& action : std::exchange(postponed_, {})) action();
}

CallContext* CallContext::Current() { return current; }

const CallDescription& CallContext::description() const { return description_; }
const std::vector<std::string>& CallContext::reasons() const { return reasons_; }
const std::vector<std::string>& CallContext::warnings() const { return warnings_; }

// A sentence may quote a file, which need not be UTF-8.
void CallContext::AddReason(const std::string& sentence) { Add(vorn::ToValidUtf8(sentence), &reasons_); }
void CallContext::AddWarning(const std::string& sentence) { Add(vorn::ToValidUtf8(sentence), &warnings_); }

void CallContext::AtEnd(std::function<void()> action) { postponed_.push_back(std::move(action)); }
bool CallContext::has_ended() const { return has_ended_; }

}  // namespace VORN
