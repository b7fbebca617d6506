#include "compiled_idmap.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "current_box.h"
#include "mapping_table.h"
#include "temporary_root.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using vorn::CompileIDMap;
using vorn::kDaemonSettingsFile;
using vorn::kMappingTableFile;

constexpr char kFile[] = "/etc/idmapd.conf";

std::vector<std::string> Compile() {
  const vorn::Result<std::vector<std::string>> sentences = CompileIDMap(vorn::CurrentBox());
  EXPECT_TRUE(sentences.ok()) << sentences.status().reason();
  return sentences.ok() ? *sentences : std::vector<std::string>();
}

TEST(CompiledIDMap, HasTheMappingsInForceAndTheSettingsWithoutThem) {
  const TemporaryRoot root;
  root.Write("/etc/passwd", "bob:x:1000:100::/:/bin/sh\n");
  root.Write(
      kFile,
      "# ours\n[General]\nDomain = x\n[Translation]\nGSS-Methods = vorn,nsswitch\n[Static]\n# people\na@X = bob\n"
      "B@X = bob # old\nb@x = 'bob'\n[Static \"x\"]\nc@X = bob\n[Mapping]\nNobody-User = nobody\nd@X = e");
  EXPECT_THAT(Compile(), IsEmpty());
  EXPECT_EQ(root.Read(kMappingTableFile), vorn::RenderMappingTable({{"a@x", "bob"}, {"b@x", "bob"}}));
  EXPECT_EQ(root.Read(kDaemonSettingsFile),
            "# ours\n[General]\nDomain = x\n[Translation]\nGSS-Methods = vorn,nsswitch\n[Static]\n# people\n"
            "[Static \"x\"]\n[Mapping]\nNobody-User = nobody\nd@X = e");
}

// A daemon whose methods need the mappings themselves is restarted for a change of them.
TEST(CompiledIDMap, KeepsTheMappingsInTheSettingsIfTheirMethodNeedsThem) {
  for (const char* methods :
       {"GSS-Methods = static,nsswitch", "GSS-Methods = vorn,static", "GSS-Methods = nsswitch,vorn",
        "Method = static\nGSS-Methods = vorn", "Method = nsswitch"}) {
    const TemporaryRoot root;
    const std::string text = "[Translation]\n" + std::string(methods) + "\n[Static]\na@X = bob\n";
    root.Write(kFile, text);
    Compile();
    EXPECT_EQ(root.Read(kDaemonSettingsFile), text);
  }
}

TEST(CompiledIDMap, SettingsDifferWhenAnotherFileDoes) {
  const TemporaryRoot root;
  root.Write(kFile, "[General]\nDomain = x\n");
  root.Write("/etc/idmapd.conf.d/a.conf", "[General]\nDomain = y\n");
  Compile();
  const std::optional<std::string> before = root.Read(kDaemonSettingsFile);
  root.Write("/etc/idmapd.conf.d/a.conf", "[General]\nDomain = zz\n");
  Compile();
  EXPECT_NE(root.Read(kDaemonSettingsFile), before);
}

TEST(CompiledIDMap, IsNotWrittenWithoutNeed) {
  const TemporaryRoot root;
  root.Write(kFile, "[Static]\na@X = root\n");
  const auto inode = [&] {
    struct stat file {};
    EXPECT_EQ(stat(root.At(kMappingTableFile).c_str(), &file), 0);
    return file.st_ino;
  };
  Compile();
  const ino_t before = inode();
  Compile();
  EXPECT_EQ(inode(), before);
}

TEST(CompiledIDMap, OfABoxWithoutAFileIsEmpty) {
  const TemporaryRoot root;
  EXPECT_THAT(Compile(), IsEmpty());
  EXPECT_EQ(root.Read(kMappingTableFile), vorn::RenderMappingTable({}));
  EXPECT_EQ(root.Read(kDaemonSettingsFile), "");
  EXPECT_FALSE(root.Read(kFile).has_value());
}

TEST(CompiledIDMap, NamesTheMappingsWithoutAUser) {
  const TemporaryRoot root;
  root.Write("/etc/passwd", "bob:x:1000:100::/:/bin/sh\n");
  root.Write(kFile, "[Static]\na@X = bob\nb@X = dave\n");
  EXPECT_THAT(Compile(), ElementsAre(root.At(kFile) + ":3: b@X is mapped to dave, who is not in /etc/passwd"));
  std::string many = "[Static]\n";
  for (int i = 0; i < 50; ++i) many += "p" + std::to_string(i) + "@X = dave\n";
  root.Write(kFile, many);
  const std::vector<std::string> sentences = Compile();
  ASSERT_EQ(sentences.size(), 21U);
  EXPECT_EQ(sentences.back(), "30 further such mappings");
}

TEST(CompiledIDMap, StaysAsItIsIfTheFileCannotBeRead) {
  const TemporaryRoot root;
  root.Write("/etc/idmapd.conf/x", "");
  EXPECT_FALSE(CompileIDMap(vorn::CurrentBox()).ok());
  EXPECT_FALSE(root.Read(kMappingTableFile).has_value());
}

}  // namespace
