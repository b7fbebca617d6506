#include "fake_platform.h"

#include <json/reader.h>
#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <stdexcept>

namespace {

FakePlatform* g_current = nullptr;

[[gnu::format(printf, 1, 0)]] std::string FormatText(const char* format, va_list arguments) {
  char* text = nullptr;
  if (vasprintf(&text, format, arguments) < 0) throw std::bad_alloc();
  const std::unique_ptr<char, decltype(&std::free)> owner(text, &std::free);
  return text;
}

LogLine TakeApart(int priority, const char* format, const std::string& text) {
  LogLine line{priority, "", 0, text, 0};
  const size_t colon = text.find(':');
  const size_t blank = text.find(' ');
  if (std::string(format).rfind("%s:%d ", 0) != 0 || colon == std::string::npos || blank < colon) return line;
  line.source = text.substr(0, colon);
  line.line = std::stoi(text.substr(colon + 1, blank - colon - 1));
  line.text = text.substr(blank + 1);
  return line;
}

[[gnu::format(printf, 2, 0)]] void Log(int priority, const char* format, va_list arguments) {
  const std::string text = FormatText(format, arguments);
  if (g_current == nullptr) return;
  g_current->log.push_back(TakeApart(priority, format, text));
  g_current->log.back().calls = g_current->calls.size();
}

bool IsRelease(const std::string& operation) {
  constexpr char kEnding[] = "Free";
  const size_t ending = operation.rfind(kEnding);
  return operation[0] == '~' || (ending != std::string::npos && ending + std::strlen(kEnding) == operation.size());
}

}  // namespace

FakePlatform::FakePlatform() : previous_(g_current) { g_current = this; }

FakePlatform::~FakePlatform() { g_current = previous_; }

FakePlatform& FakePlatform::Current() {
  if (g_current == nullptr) throw std::logic_error("a test of the module needs a FakePlatform");
  return *g_current;
}

std::vector<std::string> FakePlatform::LogTexts() const {
  std::vector<std::string> texts;
  for (const LogLine& line : log) texts.push_back(line.text);
  return texts;
}

std::vector<std::string> FakePlatform::CallsAfterFailure() const {
  return {calls.begin() + static_cast<std::ptrdiff_t>(failed_after_), calls.end()};
}

void FakePlatform::Record(const std::string& operation, const std::string& arguments) {
  calls.push_back(arguments.empty() ? operation : operation + " " + arguments);
  last_error_ = kNoFailure;
  const bool throws = !IsRelease(operation) && ++calls_that_can_throw_ == throw_at_;
  if (!throws && throwing_ != operation) return;
  failed_after_ = calls.size();
  throw std::runtime_error("thrown on demand");
}

bool FakePlatform::Fails(const std::string& operation, const std::string& arguments) {
  Record(operation, arguments);
  const int overall = ++calls_that_can_fail_;
  const int count = ++counts_[operation];
  const auto demanded = failing_.find(operation);
  const bool fails =
      overall == fail_at_ || (demanded != failing_.end() && (demanded->second == 0 || demanded->second == count));
  if (fails) {
    last_error_ = kReason;
    failed_calls.push_back(calls.back());
    failed_after_ = calls.size();
  }
  return fails;
}

int FakePlatform::Refuse() {
  last_error_ = kReason;
  return -1;
}

int FakePlatform::FailureResult(const std::string& operation) const {
  const auto found = failure_results_.find(operation);
  return found == failure_results_.end() ? -1 : found->second;
}

void FakePlatform::Died(const std::string& kind) {
  if (--live_objects[kind] == 0) live_objects.erase(kind);
}

Json::Value Parse(const std::string& json) {
  Json::Value value;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  if (!reader->parse(json.data(), json.data() + json.size(), &value, &errors)) throw std::logic_error(errors);
  return value;
}

// These replace the functions of the C library, so that the log lines of the module arrive here.
extern "C" {

void syslog(int priority, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Log(priority, format, arguments);
  va_end(arguments);
}

// The compiler replaces syslog(3) by this function in a hardened build.
// NOLINTNEXTLINE(bugprone-reserved-identifier)
[[gnu::format(printf, 3, 4)]] void __syslog_chk(int priority, int /*flag*/, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Log(priority, format, arguments);
  va_end(arguments);
}
}
