#include "change_message.h"

#include "lines.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr std::size_t kLongestSubject = 100;

struct Field {
  const char* name;
  std::string ChangeMessage::*value;
};

constexpr Field kFields[] = {{"Kind", &ChangeMessage::kind},     {"Caller", &ChangeMessage::caller},
                             {"Origin", &ChangeMessage::origin}, {"Method", &ChangeMessage::method},
                             {"Undoes", &ChangeMessage::undoes}, {"Parameters", &ChangeMessage::parameters}};

struct ListField {
  const char* name;
  std::vector<std::string> ChangeMessage::*values;
};

constexpr ListField kListFields[] = {{"File", &ChangeMessage::files}, {"Service", &ChangeMessage::actions}};

// A line break in a value would add a line to the message.
std::string OnOneLine(std::string_view text) {
  std::string line = ToValidUtf8(std::string(text));
  for (char& c : line) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7f') c = ' ';
  }
  return line;
}

std::string Subject(const ChangeMessage& message) {
  std::string subject = message.method.empty() ? message.kind : message.method;
  const std::vector<std::string>& named = message.files.empty() ? message.actions : message.files;
  for (const std::string& name : named) subject += (&name == &named.front() ? ": " : ", ") + name;
  subject = OnOneLine(subject);
  if (subject.size() > kLongestSubject) subject = ToValidUtf8(subject.substr(0, kLongestSubject - 3)) + "...";
  return subject;
}

void Read(std::string_view name, std::string_view value, ChangeMessage* message) {
  for (const Field& field : kFields) {
    if (name == field.name) message->*field.value = std::string(value);
  }
  for (const ListField& field : kListFields) {
    if (name == field.name) (message->*field.values).emplace_back(value);
  }
}

}  // namespace

std::string FormatMessage(const ChangeMessage& message) {
  std::string text = Subject(message) + "\n\n";
  for (const Field& field : kFields) {
    const std::string& value = message.*field.value;
    if (!value.empty()) text += std::string(field.name) + ": " + OnOneLine(value) + "\n";
  }
  for (const ListField& field : kListFields) {
    for (const std::string& value : message.*field.values) {
      text += std::string(field.name) + ": " + OnOneLine(value) + "\n";
    }
  }
  return text;
}

ChangeMessage ParseMessage(std::string_view text) {
  ChangeMessage message;
  const std::size_t subject_end = text.find("\n\n");
  if (subject_end == std::string_view::npos) return message;
  text.remove_prefix(subject_end + 2);
  for (const std::string_view line : LinesOf(text)) {
    const std::size_t colon = line.find(": ");
    if (colon != std::string_view::npos) Read(line.substr(0, colon), line.substr(colon + 2), &message);
  }
  return message;
}

}  // namespace vorn
