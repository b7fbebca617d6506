#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <memory>

#include "temporary_root.h"
#include "user.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Names = std::vector<std::string>;

constexpr char kPasswd[] =
    "root:x:0:0:root:/root:/bin/bash\n"
    "daemon:x:999:1:daemon:/usr/sbin:/usr/sbin/nologin\n"
    "zoe:x:1000:1000:Zoe,,,:/home/zoe:/bin/bash\n"
    "\n"
    "# a comment\n"
    "broken line\n"
    "short:x:1005\n"
    "letters:x:abc:1000::/:/bin/sh\n"
    "Alice:x:1001:1001::/home/alice:/bin/bash\n"
    "\xc3\xa4nne:x:1002:1002::/home/anne:/bin/bash\n"
    "\xe4nne:x:1003:1003:an account that JSON cannot name:/home/anne:/bin/bash\n"
    "last:x:60000:100::/:/bin/sh\n"
    "nobody:x:65534:65534:nobody:/nonexistent:/usr/sbin/nologin\n";

Names NamesOf(const std::function<int(KLIBSZLIST**)>& enumerate) {
  KLIBSZLIST* list = KLIBCSzListAlloc(1024);
  EXPECT_GE(enumerate(&list), 0);
  Names names;
  for (int i = 0; i < list->count; ++i) names.emplace_back(KLIBCSzListGet(list, i));
  KLIBCSzListFree(list);
  return names;
}

Names All() {
  return NamesOf([](KLIBSZLIST** list) { return VORNUserEnum(list, VORNUSER_LOCAL); });
}

Names With(const char* substring, int flags) {
  return NamesOf([&](KLIBSZLIST** list) { return VORNUserEnumBySubstr(list, VORNUSER_LOCAL, substring, flags); });
}

TEST(Users, AreThePeopleInTheOrderOfThePasswordFile) {
  const TemporaryRoot root;
  root.Write("/etc/passwd", kPasswd);
  EXPECT_THAT(All(), ElementsAre("zoe", "Alice", "\xc3\xa4nne", "last"));
}

TEST(Users, AreFoundInAFileOfOneLine) {
  const TemporaryRoot root;
  for (const char* ending : {"", "\n"}) {
    root.Write("/etc/passwd", std::string("zoe:x:1000:100::/:/bin/sh") + ending);
    EXPECT_THAT(All(), ElementsAre("zoe")) << ending;
  }
}

TEST(Users, RangeIsThatOfLoginDefs) {
  const TemporaryRoot root;
  root.Write("/etc/passwd", kPasswd);
  root.Write("/etc/login.defs", "# UID_MIN 5\nUID_MIN\t\t 1001 # x\nUID_MAX 1001\nSYS_UID_MIN 1\nUMASK 022\n");
  EXPECT_THAT(All(), ElementsAre("Alice"));
  root.Write("/etc/login.defs", "UID_MIN\nUID_MAX many\n");
  EXPECT_THAT(All(), ElementsAre("zoe", "Alice", "\xc3\xa4nne", "last"));
}

TEST(Users, AreFoundByAPartOfTheirName) {
  const TemporaryRoot root;
  root.Write("/etc/passwd", kPasswd);
  EXPECT_THAT(With("LI", 1), ElementsAre("Alice"));
  EXPECT_THAT(With("\xc3\x84N", 1), ElementsAre("\xc3\xa4nne"));
  EXPECT_THAT(With("LI", 0), IsEmpty());
  EXPECT_THAT(With("li", 0), ElementsAre("Alice"));
  EXPECT_EQ(With("", 1).size(), 4U);
  EXPECT_THAT(With("bash", 1), IsEmpty());
}

TEST(Users, AreFoundBehindALineOfAnyLength) {
  const TemporaryRoot root;
  for (const std::size_t length : {1'000U, 5'000U, 100'000U}) {
    root.Write("/etc/passwd",
               "long:x:1000:100:" + std::string(length, 'x') + ":/:/bin/sh\nlast:x:1001:100::/:/bin/sh\n");
    EXPECT_THAT(All(), ElementsAre("long", "last")) << length;
  }
}

TEST(Users, OfARootWithoutAPasswordFileAreNone) {
  const TemporaryRoot root;
  EXPECT_THAT(All(), IsEmpty());
  root.Write("/etc/passwd", "");
  EXPECT_THAT(All(), IsEmpty());
}

TEST(Users, OfUnreadableFilesOrAnotherTypeAreAFailure) {
  const TemporaryRoot root;
  root.Write("/etc/passwd/x", "");
  KLIBSZLIST* list = KLIBCSzListAlloc(0);
  EXPECT_LT(VORNUserEnum(&list, VORNUSER_LOCAL), 0);
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
  EXPECT_LT(VORNUserEnum(&list, 2), 0);
  EXPECT_LT(VORNUserEnum(nullptr, VORNUSER_LOCAL), 0);
  EXPECT_LT(VORNUserEnumBySubstr(&list, VORNUSER_LOCAL, nullptr, 1), 0);
  KLIBCSzListFree(list);
}

TEST(Users, MayBeMany) {
  const TemporaryRoot root;
  std::string text;
  for (int i = 0; i < 50'000; ++i)
    text += "user" + std::to_string(i) + ":x:" + std::to_string(1000 + i) + ":1::/:/bin/sh\n";
  root.Write("/etc/passwd", text);
  EXPECT_EQ(All().size(), 50'000U);
  EXPECT_THAT(With("USER49999", 1), ElementsAre("user49999"));
}

}  // namespace
