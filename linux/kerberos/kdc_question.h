// The last answer of the KDC, asked for in the background.
#ifndef VORN_LINUX_KERBEROS_KDC_QUESTION_H
#define VORN_LINUX_KERBEROS_KDC_QUESTION_H

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <vector>

#include "box.h"
#include "kdc_answer.h"
#include "status.h"
#include "store.h"

namespace vorn {

// Thread-safe. At most one thread asks at a time; it may outlive this object.
class KdcQuestion {
 public:
  using Answers = Result<std::vector<KdcAnswer>>;
  using Asker = std::function<Answers()>;  // may block

  struct Times {
    std::chrono::milliseconds patience;      // how long calls wait for a question, all together
    std::chrono::milliseconds age;           // at which an answer is asked for again
    std::chrono::milliseconds age_if_wrong;  // the same if a key was wrong: KDCs lock accounts after some wrong keys
  };

  KdcQuestion(Asker ask, Times times);

  // Returns the last answer about a keytab and a krb5.conf(5) of these versions; nullopt if there is none yet.
  std::optional<Answers> Get(const std::vector<Version>& versions);

 private:
  struct State;
  std::shared_ptr<State> state_;
};

// Returns what the KDC says about the keytab of the box; nullopt if it has not answered yet. The program vorn-ask-kdc
// asks, for 15 seconds at most; a call waits for one second at most.
std::optional<KdcQuestion::Answers> AskedKdc(const Box& box);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KDC_QUESTION_H
