// The message of a commit of the history: a text for "git log" that can be read back.
#ifndef VORN_LINUX_HISTORY_CHANGE_MESSAGE_H
#define VORN_LINUX_HISTORY_CHANGE_MESSAGE_H

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace vorn {

// Kinds of change.
inline constexpr char kByCall[] = "change";    // by a call of a method, or by a program of the platform
inline constexpr char kByHand[] = "by hand";   // found: a file differed from the history
inline constexpr char kFound[] = "found";      // the content that a file had when the history first saw it
inline constexpr char kUnrecorded[] = "late";  // a change of the platform while the history could not be written
inline constexpr char kUndo[] = "undo";        // takes back another change

// The description of a change. Each string is one line of valid UTF-8.
struct ChangeMessage {
  std::string kind = kByCall;
  std::string caller;      // the account or token; the name of the program for a change without a call
  std::string origin;      // the address of the caller, "unix", or "local" for a program
  std::string method;      // empty for a change without a call
  std::string parameters;  // JSON without secrets; may be empty
  std::string undoes;      // of an undo: the change that it takes back
  std::vector<std::string> files;
  std::vector<std::string> actions;  // of the service, with their outcome: "restart: done"
};

// A subject of at most 100 bytes, an empty line, and one line "Name: value" for each string.
std::string FormatMessage(const ChangeMessage& message);

// Reads a message of FormatMessage. Unknown lines are ignored.
ChangeMessage ParseMessage(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_HISTORY_CHANGE_MESSAGE_H
