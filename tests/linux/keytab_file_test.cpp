#include "keytab_file.h"

#include <gmock/gmock.h>

#include <set>

#include "keytab_maker.h"

namespace {

using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using vorn::KeytabKey;
using vorn::ReadKeytab;

const std::string& ThreeKeys() {
  static const std::string content = MakeKeytab({{"nfs/box.example@LAB.TEST", 3, "aes256-cts-hmac-sha1-96"},
                                                 {"host/box.example@LAB.TEST", 300, "arcfour-hmac"},
                                                 {"alice@LAB.TEST", 1, "aes128-cts-hmac-sha256-128"}});
  return content;
}

std::vector<std::string> Keys(const std::string& content) {
  const auto keys = ReadKeytab(content);
  if (!keys.ok()) return {keys.status().reason()};
  std::vector<std::string> lines;
  for (const KeytabKey& key : *keys)
    lines.push_back(std::to_string(key.version) + " " + key.principal + " (" + key.enc_type + ")");
  return lines;
}

TEST(Keytab, HasItsKeysInFileOrder) {
  EXPECT_THAT(Keys(ThreeKeys()), ElementsAre("3 nfs/box.example@LAB.TEST (aes256-cts-hmac-sha1-96)",
                                             "300 host/box.example@LAB.TEST (arcfour-hmac)",
                                             "1 alice@LAB.TEST (aes128-cts-hmac-sha256-128)"));
  EXPECT_THAT(Keys(ThreeKeys()), ElementsAreArray(ListedByKlist(ThreeKeys())));
}

TEST(Keytab, OfARealmIsReadAsKlistReadsItWithTheGapOfARemovedKey) {
  const std::string content = MakeKeytabOfARealm();
  EXPECT_THAT(content, HasSubstr(std::string(8, '\0'))) << "no hole";
  const auto keys = Keys(content);
  EXPECT_THAT(keys, SizeIs(4));
  EXPECT_THAT(keys, ElementsAreArray(ListedByKlist(content)));
}

TEST(Keytab, MayHaveNoKey) { EXPECT_THAT(Keys(EncodeFile({})), IsEmpty()); }

TEST(Keytab, NamesAnUnknownEncryptionTypeByItsNumber) {
  EXPECT_THAT(Keys(EncodeFile({EncodeEntry("alice", "LAB.TEST", 99)})), ElementsAre("1 alice@LAB.TEST (etype 99)"));
}

TEST(Keytab, QuotesWhatAPrincipalMustNotHold) {
  EXPECT_THAT(Keys(EncodeFile({EncodeEntry("a/b@c\n", "R", 17)})),
              ElementsAre("1 a\\/b\\@c\\n@R (aes128-cts-hmac-sha1-96)"));
}

// libkrb5 accepts each of these principals.
TEST(Keytab, IsNoneWhenItIsCutOffExceptBetweenTwoEntries) {
  const std::string& whole = ThreeKeys();
  std::set<std::size_t> counts;
  for (std::size_t size = 0; size < whole.size(); ++size) {
    const std::string cut = whole.substr(0, size);
    const auto keys = ReadKeytab(cut);
    if (!keys.ok()) {
      EXPECT_EQ(keys.status().code(), vorn::kNoKeytab) << size;
      continue;
    }
    EXPECT_THAT(Keys(cut), ElementsAreArray(ListedByKlist(cut))) << size;
    counts.insert(keys->size());
  }
  EXPECT_THAT(counts, ElementsAre(0U, 1U, 2U)) << "after the version, and behind the first and the second entry";
}

TEST(Keytab, MayEndInZeros) {
  for (const std::size_t zeros : {1U, 3U, 4U, 5U, 4096U}) {
    const std::string content = ThreeKeys() + std::string(zeros, '\0');
    EXPECT_THAT(Keys(content), ElementsAreArray(ListedByKlist(content))) << zeros;
    EXPECT_THAT(Keys(content), SizeIs(3)) << zeros;
    EXPECT_FALSE(ReadKeytab(content + "x").ok()) << zeros;
  }
}

TEST(Keytab, MayBeOfTheFirstVersion) {
  const std::string content = EncodeFirstVersion("nfs", "LAB.TEST", 18);
  EXPECT_THAT(Keys(content), ElementsAre("1 nfs@LAB.TEST (aes256-cts-hmac-sha1-96)"));
  EXPECT_THAT(Keys(content), ElementsAreArray(ListedByKlist(content)));
  for (std::size_t size = 3; size < content.size(); ++size) {
    EXPECT_FALSE(ReadKeytab(content.substr(0, size)).ok()) << size;
  }
}

// Returns an entry in which `size` bytes at `at` are replaced.
std::string Changed(std::string entry, std::size_t at, std::size_t size, const std::string& bytes) {
  return entry.replace(at, size, bytes);
}

TEST(Keytab, IsNoneWhenItIsDamaged) {
  const std::string entry = EncodeEntry("alice", "LAB.TEST", 17);
  const std::string good = EncodeFile({entry});
  ASSERT_TRUE(ReadKeytab(good).ok());
  const std::string zero(2, '\0');
  const std::size_t realm = 2;
  const std::size_t name = realm + 2 + 8;
  const std::size_t key = entry.size() - 18;
  const struct {
    const char* what;
    std::string content;
  } cases[] = {
      {"empty", ""},
      {"text", "nfs/box.example@LAB.TEST\n"},
      {"another version", "\x05\x03" + good.substr(2)},
      {"a byte too many", good + "x"},
      {"an entry without a size", good + std::string(4, '\0') + "x"},
      {"an entry that is larger than the file", good + std::string("\0\0\1\0abc", 7)},
      {"a hole that is larger than the file", good + "\xFF\xFF\xFF\x00 abc"},
      {"the largest hole", good + std::string("\x80\0\0\0", 4)},
      {"an entry of one byte", EncodeFile({entry, "x"})},
      {"no component", EncodeFile({Changed(entry, 0, 2, zero)})},
      {"more components than there are", EncodeFile({Changed(entry, 0, 2, "\x7F\xFF")})},
      {"no realm", EncodeFile({Changed(entry, realm, 10, zero)})},
      {"no name", EncodeFile({Changed(entry, name, 7, zero)})},
      {"a realm that is longer than the entry", EncodeFile({Changed(entry, realm, 2, "\x7F\xFF")})},
      {"a name that reaches into the next entry",
       EncodeFile({Changed(entry, name, 2, std::string("\0\x2C", 2)), entry})},
      {"a name of a negative length", EncodeFile({Changed(entry, name, 2, "\x80\x05") + std::string(0x8005, 'k')})},
      {"no key", EncodeFile({Changed(entry, key, 18, zero)})},
      {"a key that reaches into the next entry", EncodeFile({Changed(entry, key, 2, std::string("\0\x11", 2)), entry})},
      {"a damaged entry before a good one", EncodeFile({Changed(entry, realm, 2, "\x7F\xFF"), entry})}};
  for (const auto& c : cases) EXPECT_EQ(ReadKeytab(c.content).status().code(), vorn::kNoKeytab) << c.what;
}

TEST(Keytab, SurvivesAnyChangedByte) {
  for (std::size_t at = 0; at < ThreeKeys().size(); ++at) {
    for (const char byte : {'\0', '\x7F', '\x80', '\xFF'}) {
      std::string damaged = ThreeKeys();
      damaged[at] = byte;
      const auto keys = ReadKeytab(damaged);
      if (!keys.ok()) {
        EXPECT_EQ(keys.status().code(), vorn::kNoKeytab) << at;
      } else {
        EXPECT_LE(keys->size(), 3U) << at;
      }
    }
  }
}

}  // namespace
