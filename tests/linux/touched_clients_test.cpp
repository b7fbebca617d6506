// The clients that a change of /etc/exports touches, on a box whose kernel is made of files.
#include "touched_clients.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "current_box.h"
#include "draft.h"
#include "kernel_caches.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class TouchedClientsOf : public testing::Test {
 protected:
  TouchedClientsOf() {
    AddClient(1, "10.9.0.11");
    AddClient(2, "10.9.0.12");
    AddClient(3, "10.9.0.13");  // uses nothing
    caches_.Fill("auth.unix.ip", "nfsd 10.9.0.11 10.9.0.11,10.9.0.0/24\nnfsd 10.9.0.12 10.9.0.0/24\n");
    caches_.Fill("nfsd.export",
                 "/srv/data\t10.9.0.11,10.9.0.0/24(rw,sec=1)\n/srv/data\t10.9.0.0/24(ro,sec=1)\n"
                 "/srv/other\t10.9.0.0/24(rw,sec=1)\n");
    root_.Write("/var/lib/nfs/rmtab", "10.9.0.14:/srv/data:0x1\nnamed.lab.test:/srv/data:0x1\n");
    root_.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\nfirewall = no\n");
    for (const char* folder : {"data", "other"}) root_.Write("/srv/" + std::string(folder) + "/file", "");
  }

  void AddClient(int number, const std::string& address) {
    root_.Write("/proc/fs/nfsd/clients/" + std::to_string(number) + "/info",
                "clientid: 0x1\naddress: \"" + address + ":871\"\nname: \"c\"\nminor version: 2\n");
  }

  // "address version path: changes" of each client that the change of the lines of /srv/data touches. "?": not certain.
  std::vector<std::string> Touched(const std::string& before, const std::string& after) {
    root_.Write("/etc/exports", before);
    const VORN::Draft draft;
    Box& box = draft.state().box;
    const Result<StoredFile> file = box.Read("/etc/exports");
    EXPECT_TRUE(file.ok() && box.Replace("/etc/exports", after, file->version).ok());
    const Result<TouchedClients> touched = FindTouchedClients(RealBox(), box, {"/srv/data"}, most_);
    EXPECT_TRUE(touched.ok());
    is_complete_ = touched->is_complete;
    std::vector<std::string> texts;
    for (const TouchedClient& client : touched->clients) {
      std::string text = client.address + " " + client.version + " " + client.path + ":";
      for (const RightChange& right : client.rights) text += " " + right.change;
      texts.push_back(text + (client.is_certain ? "" : " ?"));
    }
    return texts;
  }

  std::size_t most_ = 1000;
  bool is_complete_ = false;  // of the last answer
  const TemporaryRoot root_;
  const KernelCaches caches_{root_};
};

TEST_F(TouchedClientsOf, AreThoseWhoseRuleChanges) {
  EXPECT_THAT(Touched("/srv/data 10.9.0.11(rw) 10.9.0.0/24(ro)\n", "/srv/data 10.9.0.11(ro) 10.9.0.0/24(ro)\n"),
              ElementsAre("10.9.0.11 4.2 /srv/data: read_only"));
}

TEST_F(TouchedClientsOf, MayHaveAnotherRuleThatAdmitsThem) {
  EXPECT_THAT(Touched("/srv/data 10.9.0.11(rw) 10.9.0.0/24(ro)\n", "/srv/data 10.9.0.0/24(ro)\n"),
              ElementsAre("10.9.0.11 4.2 /srv/data: read_only"));
}

TEST_F(TouchedClientsOf, LoseAnExportWithTheLastRule) {
  EXPECT_THAT(Touched("/srv/data 10.9.0.0/24(rw)\n", ""),
              ElementsAre("10.9.0.11 4.2 /srv/data: removed", "10.9.0.12 4.2 /srv/data: removed",
                          "10.9.0.14 3 /srv/data: removed"));
}

TEST_F(TouchedClientsOf, AreTouchedByFlavorsAndSquashing) {
  EXPECT_THAT(Touched("/srv/data 10.9.0.12(rw,no_root_squash,sec=sys:krb5)\n", "/srv/data 10.9.0.12(rw,sec=sys)\n"),
              ElementsAre("10.9.0.12 4.2 /srv/data: flavor_removed root_squashed"));
}

TEST_F(TouchedClientsOf, AreNoneOfAnotherExportOrWithoutAChange) {
  EXPECT_THAT(Touched("/srv/data 10.9.0.0/24(rw)\n/srv/other *(rw)\n", "/srv/data 10.9.0.0/24(rw)\n/srv/other *(ro)\n"),
              IsEmpty());
  EXPECT_THAT(Touched("/srv/data 10.9.0.0/24(rw)\n", "/srv/data 10.9.0.0/24(rw) 10.8.0.0/24(rw)\n"), IsEmpty());
}

TEST_F(TouchedClientsOf, AreNotCertainWhereNamesDecide) {
  EXPECT_THAT(Touched("/srv/data 10.9.0.12(rw) *.lab.test(rw)\n", "/srv/data 10.9.0.12(ro) *.lab.test(rw)\n"),
              ElementsAre("10.9.0.12 4.2 /srv/data: read_only ?"));
}

TEST_F(TouchedClientsOf, AreNotCompleteIfThereIsTooMuchToCompare) {
  most_ = 4;  // one rule before and one after, for two clients
  EXPECT_THAT(Touched("/srv/data 10.9.0.0/24(rw)\n", "/srv/data 10.9.0.0/24(ro)\n"),
              ElementsAre("10.9.0.11 4.2 /srv/data: read_only", "10.9.0.12 4.2 /srv/data: read_only"));
  EXPECT_FALSE(is_complete_);
  most_ = 6;
  EXPECT_EQ(Touched("/srv/data 10.9.0.0/24(rw)\n", "/srv/data 10.9.0.0/24(ro)\n").size(), 3U);
  EXPECT_TRUE(is_complete_);
}

}  // namespace
}  // namespace vorn
