// The answer of a KDC about the keys of a keytab.
#ifndef VORN_LINUX_KERBEROS_KDC_ANSWER_H
#define VORN_LINUX_KERBEROS_KDC_ANSWER_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

// The answer about one principal.
struct KdcAnswer {
  enum class State {
    kCurrent,   // the keytab can read the tickets that clients get for the principal
    kOutdated,  // it cannot: the KDC has another key
    kUnknown,   // the KDC has no such principal
    kNone       // the KDC could not be asked, or refused to answer
  };
  State state = State::kNone;
  std::string principal;
  std::string detail;              // of kOutdated: the key of the KDC, if it told; of kNone: the reason
  std::optional<long> clock_lead;  // seconds by which the clock of the KDC is ahead of that of the box
};

// Answers as lines of text, which ParseAnswers reads.
std::string FormatAnswers(const std::vector<KdcAnswer>& answers);

// Fails with kSyntax if the text is no list of answers.
Result<std::vector<KdcAnswer>> ParseAnswers(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KDC_ANSWER_H
