// Box: readers share parsed documents, and no edit is lost.
#include "box.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <memory>
#include <optional>

#include "call.h"
#include "captured_log.h"
#include "configuration_lock.h"
#include "core.h"
#include "current_box.h"
#include "firewall.h"
#include "injected_failures.h"
#include "nfsconf.h"
#include "processes.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::Contains;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr char kFile[] = "/etc/nfs.conf";

int parses = 0;

Result<std::string> Parse(StoredFile file) {
  ++parses;
  return std::move(file.text);
}

std::string Load(Box& box) {
  const auto text = box.Load<std::string>(kFile, Parse);
  EXPECT_TRUE(text.ok()) << text.status().reason();
  return text.ok() ? **text : "";
}

// Waits until the file is old enough for its document to be cached.
void WaitUntilCacheable(Box& box) {
  ASSERT_TRUE(Eventually([&] { return box.Read(kFile)->is_settled; }));
}

TEST(Box, ParsesAnUnchangedFileOnce) {
  const TemporaryRoot root;
  root.Write(kFile, "text");
  Box& box = CurrentBox();
  WaitUntilCacheable(box);
  parses = 0;
  const auto first = box.Load<std::string>(kFile, Parse);
  const auto second = box.Load<std::string>(kFile, Parse);
  EXPECT_EQ(parses, 1);
  EXPECT_EQ(first->get(), second->get()) << "readers share the document";
}

TEST(Box, ParsesAChangedFileAgain) {
  const TemporaryRoot root;
  root.Write(kFile, "one");
  Box& box = CurrentBox();
  WaitUntilCacheable(box);
  EXPECT_EQ(Load(box), "one");
  root.Write(kFile, "three");
  EXPECT_EQ(Load(box), "three");
}

TEST(Box, NeverKeepsAFileThatMayChangeWithoutANewVersion) {
  const TemporaryRoot root;
  Box& box = CurrentBox();
  for (int i = 0; i < 200; ++i) {
    const std::string text = std::to_string(1000 + i);  // always of the same size
    root.Write(kFile, text);
    ASSERT_EQ(Load(box), text);
  }
}

TEST(Box, HandsTheLastDocumentToTheParserOfTheNext) {
  const TemporaryRoot root;
  Box& box = CurrentBox();
  const auto load = [&box] {
    const auto parse = [](StoredFile file, const std::string* previous) -> Result<std::string> {
      return (previous == nullptr ? "nothing" : *previous) + ", " + file.text;
    };
    return **box.LoadAfter<std::string>(kFile, parse);
  };
  root.Write(kFile, "one");
  EXPECT_EQ(load(), "nothing, one");
  root.Write(kFile, "other");
  EXPECT_EQ(load(), "nothing, one, other");
}

TEST(Box, RefusesAWriteIfTheFileChangedSinceTheContextReadIt) {
  const TemporaryRoot root;
  root.Write(kFile, "one");
  Box& box = CurrentBox();
  const ConfigurationLock lock(box);
  Load(box);
  root.Write(kFile, "by hand");
  const Result<StoredFile> later = box.Read(kFile);
  EXPECT_EQ(box.Replace(kFile, "two", later->version).code(), kChangedBehind);
  EXPECT_EQ(root.Read(kFile), "by hand");
}

TEST(Box, AcceptsSeveralWritesOfOneContext) {
  const TemporaryRoot root;
  Box& box = CurrentBox();
  const ConfigurationLock lock(box);
  for (const char* text : {"one", "two", "three"}) {
    const Result<StoredFile> file = box.Read(kFile);
    EXPECT_TRUE(box.Replace(kFile, text, file->version).ok());
  }
  EXPECT_EQ(root.Read(kFile), "three");
}

// Writes twice in one context. Returns 1 if a write notices that somebody else has changed the file.
int WriteTwice(Box& box, const Version& expected) {
  const ConfigurationLock lock(box);
  if (box.Replace(kFile, "one", expected).code() == kChangedBehind) return 1;
  const Result<StoredFile> file = box.Read(kFile);
  return box.Replace(kFile, "other", file->version).code() == kChangedBehind ? 1 : 0;
}

TEST(Box, TakesNoEditForAWriteOfItsContext) {
  int call = 0;
  for (;; ++call) {
    const TemporaryRoot root;
    root.Write(kFile, "old");
    Box& box = CurrentBox();
    const Version old = box.Read(kFile)->version;
    bool is_over = false;
    const std::optional<int> noticed = InterruptAtSystemCall(
        call, [&] { return WriteTwice(box, old); },
        [&] {
          is_over = root.Read(kFile) == "other";
          root.Write(kFile, "by hand");
        });
    if (!noticed) break;
    ASSERT_EQ(root.Read(kFile), "by hand") << call;
    ASSERT_EQ(*noticed == 0, is_over) << call;
  }
  EXPECT_GT(call, 20);
}

TEST(Box, ForgetsWhatAContextReadWhenItEnds) {
  const TemporaryRoot root;
  root.Write(kFile, "one");
  Box& box = CurrentBox();
  {
    const ConfigurationLock lock(box);
    Load(box);
  }
  root.Write(kFile, "by hand");
  const ConfigurationLock lock(box);
  const Result<StoredFile> file = box.Read(kFile);
  EXPECT_TRUE(box.Replace(kFile, "two", file->version).ok());
}

// A call that may only read.
class ReadOnlyCall : public testing::Test {
 protected:
  ReadOnlyCall() {
    VORN::CallDescription description;
    description.method = "VORN.Core.FileServ.NFS/v1/get";
    description.may_write = false;
    call_ = std::make_unique<VORN::CallContext>(description);
  }

  const TemporaryRoot root_;
  std::unique_ptr<VORN::CallContext> call_;
};

TEST_F(ReadOnlyCall, TakesNoLock) {
  const VornConf configuration;
  EXPECT_THAT(root_.Names(""), IsEmpty());
  _tag_nfs_id_map_* map = VORNNFSIDMapGet();
  EXPECT_NE(map, nullptr);
  VORNNFSIDMapFree(map);
  EXPECT_THAT(root_.Names(""), IsEmpty());
}

TEST_F(ReadOnlyCall, ChangesNothing) {
  root_.Write("/bin/program", "#!/bin/sh\ntouch \"$VORN_ROOT/touched\"\n");
  root_.Write("/etc/vorn/platform.conf", "[platform]\nfirewall = yes\n");
  const auto before = root_.Names("/");
  const NFSConfRecord record{};
  const ExportRuleList rules{};
  _tag_nfs_id_map_* map = VORNNFSIDMapGet();
  ASSERT_NE(map, nullptr);
  KLIBCSzHashSetValue(&map->table, "alice@LAB.TEST", "alice");
  const struct {
    const char* name;
    int result;
  } cases[] = {
      {"the record", VORNNFSConfSet(&record)},
      {"the ID map", VORNNFSIDMapSet("/etc/idmapd.conf", map)},
      {"export rules", VORNNFSRuleExtSetAll("/volume1/data", &rules)},
      {"transfer sizes", VORNNFSUDPPrefSizeSet(8192, 8192)},
      {"UNIX permissions", VORNNFSUNIXPriEnableSet(1)},
      {"a start", KLIBServiceStart("nfsd", 0)},
      {"a stop", KLIBServiceStop("nfsd", 0)},
      {"a restart", KLIBServiceRestart("nfsd")},
      {"a reload", KLIBServiceReload("nfsd")},
      {"the firewall", VORNFwRuleHup()},
      {"a program", KLIBCExec("/bin/program", nullptr, nullptr, nullptr, nullptr)},
  };
  VORNNFSIDMapFree(map);
  for (const auto& c : cases) EXPECT_LT(c.result, 0) << c.name;
  EXPECT_EQ(KLIBCErrGet(), EROFS);
  EXPECT_EQ(root_.Names("/"), before);
  EXPECT_THAT(call_->reasons(), Contains(HasSubstr("VORN.Core.FileServ.NFS/v1/get, which may only read")));
}

TEST(CallContext, CollectsTheReasonOfAFailure) {
  const TemporaryRoot root;
  const VORN::CallContext call({});
  EXPECT_LT(KLIBServiceStart("ftpd", 0), 0);
  EXPECT_THAT(call.reasons(), testing::ElementsAre("there is no service \"ftpd\""));
}

TEST(CallContext, AnswersInUtf8) {
  const TemporaryRoot root;
  VORN::CallContext call({});
  EXPECT_LT(KLIBServiceStart("ft\xe4pd", 0), 0);
  call.AddWarning(std::string(1023, 'x') + "\xc3\xa4");
  EXPECT_THAT(call.reasons(), testing::ElementsAre("there is no service \"ft\xef\xbf\xbdpd\""));
  EXPECT_THAT(call.warnings(), testing::ElementsAre(std::string(1023, 'x')));
}

}  // namespace
}  // namespace vorn
