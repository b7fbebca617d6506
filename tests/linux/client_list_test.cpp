// The clients of a box whose kernel is made of files.
#include "client_list.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <ctime>
#include <string>
#include <vector>

#include "call.h"
#include "clients.h"
#include "current_box.h"
#include "kernel_caches.h"
#include "rehearsal.h"
#include "temporary_root.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr char kClients[] = "/proc/fs/nfsd/clients/";
constexpr char kHeading[] = "  sl  local_address rem_address   st\n";

class ClientList : public testing::Test {
 protected:
  ClientList() {
    AddClient(7, "0x2", "10.9.0.11:871", "Linux NFSv4.2 work", 2);
    caches_.Fill("auth.unix.ip",
                 "#class IP domain\n"
                 "nfsd 10.9.0.11 10.9.0.0/24\n"
                 "nfsd 10.9.0.12 10.9.0.0/24\n"
                 "# nfsd 10.9.0.9 -no-domain-\n");
    caches_.Fill("nfsd.export",
                 "#path domain(flags)\n"
                 "/srv/data\t10.9.0.0/24(rw,sec=1)\n"
                 "# /srv/secret\t10.9.0.0/24()\n");
    root_.Write("/proc/fs/nfsd/export_stats",
                "/srv/data\t10.9.0.0/24\t0\n\tfh_stale: 0\n\tio_read: 10\n\tio_write: 20\n");
    root_.Write("/var/lib/nfs/rmtab", "10.9.0.12:/srv/old:0x1\nnamed.lab.test:/srv/data:0x1\n");
  }

  void AddClient(int number, const std::string& id, const std::string& address, const std::string& name, int minor) {
    const std::string folder = kClients + std::to_string(number) + "/";
    root_.Write(folder + "info", "clientid: " + id + "\naddress: \"" + address +
                                     "\"\nstatus: confirmed\nseconds from last renew: 3\nname: \"" + name +
                                     "\"\nminor version: " + std::to_string(minor) + "\n");
    root_.Write(folder + "states", "");
    root_.Write(folder + "ctl", "");
  }

  // "address version state" of each row, or its name if it has no address.
  std::vector<std::string> List(const std::string& filter = "", int offset = 0, int limit = 1000) {
    EXPECT_EQ(VORN::ListClients(filter, offset, limit, &clients_, &total_), 0);
    std::vector<std::string> rows;
    for (const VORN::NFSClient& client : clients_) {
      rows.push_back((client.address.empty() ? client.name : client.address) + " " + client.version + " " +
                     client.state);
    }
    return rows;
  }

  const TemporaryRoot root_;
  const KernelCaches caches_{root_};
  std::vector<VORN::NFSClient> clients_;
  int total_ = -1;
};

TEST_F(ClientList, HasClientsOfAllVersionsAndThoseThatWereTurnedAway) {
  EXPECT_THAT(List(), ElementsAre("10.9.0.9  refused", "10.9.0.11 4.2 confirmed", "10.9.0.12 3 mounted",
                                  "named.lab.test 3 mounted"));
  EXPECT_EQ(total_, 4);
}

TEST_F(ClientList, HasWhatTheKernelKnowsOfAClient) {
  root_.Write(std::string(kClients) + "7/states",
              "- 0x000000010200000000000000"
              "01000000: { type: lock, superblock: \"62:00:12\", filename: \"a\" }\n");
  List();
  const VORN::NFSClient& client = clients_[1];
  EXPECT_EQ(client.id, 7U);
  EXPECT_EQ(client.client_id, "0x2");
  EXPECT_EQ(client.name, "Linux NFSv4.2 work");
  EXPECT_EQ(client.renewed, 3);
  EXPECT_GT(client.since, 1700000000);
  EXPECT_EQ(client.open_files, 0U);
  EXPECT_EQ(client.locks, 1U);
  ASSERT_EQ(client.exports.size(), 1U);
  EXPECT_EQ(client.exports[0].path, "/srv/data");
  EXPECT_FALSE(client.exports[0].is_mounted);
  EXPECT_EQ(client.exports[0].rule, "10.9.0.0/24");
  EXPECT_EQ(client.exports[0].bytes_read, 10U);
  EXPECT_EQ(client.exports[0].bytes_written, 20U);
  // The kernel counts from the start of the system, which was before now.
  EXPECT_GT(client.exports[0].since, 1700000000);
  EXPECT_LE(client.exports[0].since, std::time(nullptr));
  ASSERT_EQ(client.refusals.size(), 1U);
  EXPECT_EQ(client.refusals[0].path, "/srv/secret");
  EXPECT_EQ(client.refusals[0].reason, "not_exported");
}

TEST_F(ClientList, HasTheRecordedMountsOfNFSv3) {
  List();
  const VORN::NFSClient& client = clients_[2];
  EXPECT_FALSE(client.id);
  EXPECT_FALSE(client.open_files);
  EXPECT_FALSE(client.since);
  ASSERT_EQ(client.exports.size(), 2U);
  EXPECT_FALSE(client.exports[0].is_mounted);
  EXPECT_TRUE(client.exports[1].is_mounted);
  EXPECT_EQ(client.exports[1].path, "/srv/old");
  EXPECT_EQ(client.exports[1].rule, "");
  EXPECT_FALSE(client.exports[1].bytes_read);
  EXPECT_EQ(clients_[3].name, "named.lab.test");
  EXPECT_EQ(clients_[3].exports.size(), 1U);
}

TEST_F(ClientList, SaysWhyAnAddressWasTurnedAway) {
  List();
  ASSERT_EQ(clients_[0].refusals.size(), 1U);
  EXPECT_EQ(clients_[0].refusals[0].reason, "no_rule");
  EXPECT_EQ(clients_[0].refusals[0].path, "");
}

TEST_F(ClientList, HasTheMountsThatWereLogged) {
  vorn::MountLog log;
  log.Add({"10.9.0.12", "/srv/old", ""}, 1700000000);
  log.Add({"10.9.0.12", "/a", "port"}, 1700000001);
  log.Add({"10.9.0.77", "/b", "path"}, 1700000002);
  const auto page = vorn::ListClients(vorn::RealBox(), log, "10.9.0.", 2, 10);
  ASSERT_TRUE(page.ok());
  ASSERT_EQ(page->clients.size(), 2U);
  EXPECT_EQ(page->clients[0].since, 1700000000);
  ASSERT_EQ(page->clients[0].refusals.size(), 2U);
  EXPECT_EQ(page->clients[0].refusals[0].path, "/a");
  EXPECT_EQ(page->clients[0].refusals[0].reason, "port");
  EXPECT_EQ(page->clients[0].refusals[0].count, 1);
  EXPECT_EQ(page->clients[0].refusals[0].last, 1700000001);
  EXPECT_EQ(page->clients[0].refusals[1].path, "/srv/secret");
  EXPECT_EQ(page->clients[1].address, "10.9.0.77");
  EXPECT_EQ(page->clients[1].state, "refused");
  EXPECT_EQ(page->clients[1].refusals[0].text, "There is no such path.");
}

// The address is in the byte order of this machine, and so are the words of the table.
TEST_F(ClientList, TellsAConnectionFromThatOfAClientOfNFSv4) {
  constexpr char kLine[] = "0: 00000000000000000000000001000000:0801 ";
  constexpr char kSame[] = "07070707";  // 7.7.7.7 in both byte orders
  AddClient(8, "0x3", "7.7.7.7:871", "other", 0);
  root_.Write("/proc/net/tcp", kHeading + std::string(kLine) + kSame + ":0367 01 0\n");
  EXPECT_THAT(List("7.7.7.7"), ElementsAre("7.7.7.7 4.0 confirmed"));
  root_.Write("/proc/net/tcp", kHeading + std::string(kLine) + "08080808:0367 01 0\n");
  EXPECT_THAT(List("8.8.8.8"), ElementsAre("8.8.8.8  connected"));
  root_.Write("/var/lib/nfs/rmtab", "8.8.8.8:/srv/data:0x1\n");
  EXPECT_THAT(List("8.8.8.8"), ElementsAre("8.8.8.8 3 connected"));
}

TEST_F(ClientList, IsOrderedByAddressAndPaged) {
  AddClient(30, "0x4", "[fd00:9::b]:871", "six", 1);
  AddClient(4, "0x5", "10.10.0.1:871", "ten", 1);
  EXPECT_THAT(List("", 1, 2), ElementsAre("10.9.0.11 4.2 confirmed", "10.9.0.12 3 mounted"));
  EXPECT_EQ(total_, 6);
  EXPECT_THAT(List("", 3, 100),
              ElementsAre("10.10.0.1 4.1 confirmed", "fd00:9::b 4.1 confirmed", "named.lab.test 3 mounted"));
  EXPECT_THAT(List("", 6, 100), IsEmpty());
  EXPECT_THAT(List("", 100, 100), IsEmpty());
  EXPECT_THAT(List("", 0, 0), IsEmpty());
}

TEST_F(ClientList, HasTheClientsOfAnAddressInTheOrderOfTheirNumbers) {
  for (const int number : {30, 4, 100, 9}) AddClient(number, "0x9", "10.9.0.20:871", "same", 2);
  List("10.9.0.20");
  std::vector<std::uint64_t> numbers;
  for (const VORN::NFSClient& client : clients_) numbers.push_back(client.id.value_or(0));
  EXPECT_THAT(numbers, ElementsAre(4, 9, 30, 100));
}

TEST_F(ClientList, IsFilteredByTextOfTheClient) {
  EXPECT_THAT(List("nfsV4.2 WORK"), ElementsAre("10.9.0.11 4.2 confirmed"));
  EXPECT_THAT(List("0.12"), ElementsAre("10.9.0.12 3 mounted"));
  EXPECT_THAT(List("/srv/old"), ElementsAre("10.9.0.12 3 mounted"));
  EXPECT_THAT(List("secret"), ElementsAre("10.9.0.11 4.2 confirmed", "10.9.0.12 3 mounted"));
  EXPECT_THAT(List("no such text"), IsEmpty());
  EXPECT_EQ(total_, 0);
}

TEST_F(ClientList, IsValidUtf8WhateverClientsCallThemselves) {
  AddClient(8, "0x3", "10.9.0.13:871", R"(\xff\x0a\x1b)", 0);
  List("10.9.0.13");
  ASSERT_EQ(clients_.size(), 1U);
  EXPECT_EQ(clients_[0].name, "\xef\xbf\xbd\n\x1b");
}

TEST_F(ClientList, IsEmptyOnABoxThatServesNobody) {
  const TemporaryRoot empty;
  EXPECT_THAT(List(), IsEmpty());
  EXPECT_EQ(total_, 0);
}

TEST_F(ClientList, LeavesOutWhatIsNoClientAndWhoHasLeft) {
  root_.Write(std::string(kClients) + "notes/info", "clientid: 0x9\n");
  root_.Write(std::string(kClients) + "99/other", "");  // a folder without a description: the client is leaving
  EXPECT_EQ(List().size(), 4U);
}

TEST_F(ClientList, FailsIfAClientCannotBeRead) {
  root_.Write(std::string(kClients) + "8/info/file", "");
  EXPECT_EQ(VORN::ListClients("", 0, 10, &clients_, &total_), VORN::kClientsFailed);
}

// "Disconnect" writes the kernel's word to the client's control file.
TEST_F(ClientList, DisconnectsAClient) {
  EXPECT_EQ(VORN::DisconnectClient(7, "0x2"), 0);
  EXPECT_EQ(root_.Read(std::string(kClients) + "7/ctl"), "expire\n");
}

TEST_F(ClientList, DisconnectsNobodyElse) {
  EXPECT_EQ(VORN::DisconnectClient(7, "0x3"), VORN::kClientsGone);
  EXPECT_EQ(VORN::DisconnectClient(7, ""), VORN::kClientsGone);
  EXPECT_EQ(VORN::DisconnectClient(8, "0x2"), VORN::kClientsGone);
  EXPECT_EQ(root_.Read(std::string(kClients) + "7/ctl"), "");
}

TEST_F(ClientList, FailsToDisconnectWithoutTheKernel) {
  root_.Write(std::string(kClients) + "9/info", "clientid: 0x9\n");
  EXPECT_EQ(VORN::DisconnectClient(9, "0x9"), VORN::kClientsGone);
  root_.Write(std::string(kClients) + "9/ctl/file", "");
  EXPECT_EQ(VORN::DisconnectClient(9, "0x9"), VORN::kClientsFailed);
}

TEST_F(ClientList, DisconnectsNobodyInACallThatMayOnlyRead) {
  VORN::CallDescription description;
  description.may_write = false;
  const VORN::CallContext call(description);
  EXPECT_EQ(VORN::DisconnectClient(7, "0x2"), VORN::kClientsFailed);
  EXPECT_EQ(root_.Read(std::string(kClients) + "7/ctl"), "");
}

TEST_F(ClientList, RehearsesADisconnection) {
  const VORN::Draft draft;
  VORN::CallDescription description;
  description.draft = &draft;
  {
    const VORN::CallContext call(description);
    EXPECT_EQ(VORN::DisconnectClient(7, "0x2"), 0);
    EXPECT_EQ(VORN::DisconnectClient(7, "0x3"), VORN::kClientsGone);
    EXPECT_EQ(VORN::DisconnectClient(1, "0x2"), VORN::kClientsGone);
  }
  EXPECT_EQ(root_.Read(std::string(kClients) + "7/ctl"), "");
  const VORN::Rehearsal rehearsal = draft.Report();
  ASSERT_EQ(rehearsal.actions.size(), 1U);
  EXPECT_EQ(rehearsal.actions[0].action, "disconnect");
  EXPECT_EQ(rehearsal.actions[0].clients, "disconnect");
}

// 5,000 clients of NFSv4 and 5,000 of NFSv3.
TEST_F(ClientList, OfThousandsIsComplete) {
  std::string mounts;
  for (int i = 0; i < 5000; ++i) {
    const std::string host = std::to_string(i / 250) + "." + std::to_string(i % 250);
    AddClient(100 + i, "0x" + std::to_string(100 + i), "10.20." + host + ":871", "client " + std::to_string(i), 2);
    mounts += "10.30." + host + ":/srv/data:0x1\n";
  }
  root_.Write("/var/lib/nfs/rmtab", mounts);
  EXPECT_EQ(List("", 4000, 1000).size(), 1000U);
  EXPECT_EQ(total_, 10002);
  EXPECT_EQ(List("client 4999").size(), 1U);
}

}  // namespace
