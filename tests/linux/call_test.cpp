// CallContext: which context of a thread is the current one, and what it collects.
#include "call.h"

#include <gmock/gmock.h>

#include <string>
#include <thread>

namespace {

using testing::ElementsAre;
using testing::SizeIs;
using VORN::CallContext;

TEST(CallContext, IsTheInnermostOneOfItsThread) {
  EXPECT_EQ(CallContext::Current(), nullptr);
  const CallContext outer({});
  EXPECT_EQ(CallContext::Current(), &outer);
  {
    const CallContext inner({});
    EXPECT_EQ(CallContext::Current(), &inner);
  }
  EXPECT_EQ(CallContext::Current(), &outer);
  std::thread([] { EXPECT_EQ(CallContext::Current(), nullptr); }).join();
}

TEST(CallContext, KeepsEachSentenceOnceInOrder) {
  CallContext context({});
  context.AddReason("second");
  context.AddReason("first");
  context.AddReason("second");
  context.AddWarning("a warning");
  EXPECT_THAT(context.reasons(), ElementsAre("second", "first"));
  EXPECT_THAT(context.warnings(), ElementsAre("a warning"));
}

TEST(CallContext, BoundsWhatItKeeps) {
  CallContext context({});
  for (int i = 0; i < 100; ++i) context.AddWarning(std::to_string(i));
  EXPECT_THAT(context.warnings(), SizeIs(32));
  context.AddReason(std::string(1023, 'x') + "\xC3\xA9");
  EXPECT_THAT(context.reasons(), ElementsAre(std::string(1023, 'x'))) << "no character is cut in two";
}

}  // namespace
