#include "kdc_question.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>

#include "processes.h"

namespace vorn {
namespace {

using namespace std::chrono_literals;
using State = KdcAnswer::State;
using Times = KdcQuestion::Times;

std::vector<Version> VersionOf(unsigned number) { return {{true, {number}}}; }

// A KDC that answers with this state and counts the questions.
struct Kdc {
  std::shared_ptr<std::atomic<int>> asked = std::make_shared<std::atomic<int>>(0);
  State state = State::kCurrent;

  KdcQuestion::Asker asker() const {
    return [asked = asked, state = state]() -> KdcQuestion::Answers {
      ++*asked;
      return std::vector<KdcAnswer>{{state, "nfs/box@X", "", {}}};
    };
  }
};

TEST(KdcQuestion, DoesNotWaitForAKdcThatIsSilent) {
  std::promise<void> end;
  const std::shared_future<void> ended = end.get_future().share();
  const auto asked = std::make_shared<std::atomic<int>>(0);
  KdcQuestion question(
      [ended, asked]() -> KdcQuestion::Answers {
        ++*asked;
        ended.wait();
        return std::vector<KdcAnswer>();
      },
      Times{1ms, 1h, 1h});
  for (int call = 0; call < 3; ++call) EXPECT_FALSE(question.Get(VersionOf(1)));
  EXPECT_TRUE(Eventually([&] { return asked->load() == 1; })) << "one thread asks";
  EXPECT_FALSE(question.Get(VersionOf(2)));
  EXPECT_EQ(asked->load(), 1);
  end.set_value();
  EXPECT_TRUE(Eventually([&] { return question.Get(VersionOf(1)).has_value(); }));
}

TEST(KdcQuestion, KeepsAnAnswerForItsFiles) {
  const Kdc kdc;
  KdcQuestion question(kdc.asker(), Times{1h, 1h, 1h});
  for (int call = 0; call < 2; ++call) {
    const auto answers = question.Get(VersionOf(1));
    ASSERT_TRUE(answers && answers->ok());
    EXPECT_EQ((*answers)->front().state, State::kCurrent);
  }
  EXPECT_EQ(kdc.asked->load(), 1);
  EXPECT_TRUE(question.Get(VersionOf(2)));
  EXPECT_EQ(kdc.asked->load(), 2) << "about another keytab";
}

TEST(KdcQuestion, TriesAWrongKeySeldom) {
  Kdc kdc;
  for (const auto& [state, count] : {std::pair(State::kCurrent, 2), std::pair(State::kNone, 2),
                                     std::pair(State::kUnknown, 2), std::pair(State::kOutdated, 1)}) {
    kdc.state = state;
    *kdc.asked = 0;
    KdcQuestion question(kdc.asker(), Times{1h, 0ms, 1h});
    for (int call = 0; call < 2; ++call) EXPECT_TRUE(question.Get(VersionOf(1)));
    EXPECT_EQ(kdc.asked->load(), count) << static_cast<int>(state);
  }
}

}  // namespace
}  // namespace vorn
