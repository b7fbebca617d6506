#include "kdc_answer.h"

#include <gtest/gtest.h>

namespace vorn {
namespace {

using State = KdcAnswer::State;

TEST(KdcAnswer, ComesBackFromItsText) {
  const std::vector<KdcAnswer> answers = {{State::kCurrent, "nfs/a@X", "", 0},
                                          {State::kOutdated, "nfs/b@X", "version 3", -400},
                                          {State::kUnknown, "nfs/c@X", "", {}},
                                          {State::kNone, "nfs/d\n@X", "a\tb", {}}};
  const Result<std::vector<KdcAnswer>> read = ParseAnswers(FormatAnswers(answers));
  ASSERT_TRUE(read.ok()) << read.status().reason();
  ASSERT_EQ(read->size(), answers.size());
  for (std::size_t at = 0; at < answers.size(); ++at) {
    EXPECT_EQ((*read)[at].state, answers[at].state);
    EXPECT_EQ((*read)[at].clock_lead, answers[at].clock_lead);
  }
  EXPECT_EQ((*read)[1].principal, "nfs/b@X");
  EXPECT_EQ((*read)[1].detail, "version 3");
  EXPECT_EQ((*read)[3].principal, "nfs/d @X");
  EXPECT_EQ((*read)[3].detail, "a b");
  EXPECT_TRUE(ParseAnswers("")->empty());
}

TEST(KdcAnswer, IsNotReadFromOtherTexts) {
  for (const char* text :
       {"\n", "current\n", "current\tnfs/a@X\t0\n", "fine\tnfs/a@X\t0\t\n", "current\tnfs/a@X\tx\t\n",
        "current\tnfs/a@X\t1x\t\n", "current\tnfs/a@X\t99999999999999999999\t\n", "current\tnfs/a@X\t0\t\tmore\n"}) {
    EXPECT_FALSE(ParseAnswers(text).ok()) << text;
  }
}

}  // namespace
}  // namespace vorn
