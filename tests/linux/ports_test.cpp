#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <climits>
#include <string>

#include "nfsconf.h"
#include "temporary_root.h"
#include "webapi.h"

namespace {

using WebUtils::IsPortConflict;

// A socket that somebody else has at a port that the system chose.
class Somebody {
 public:
  Somebody(int family, int type) : socket_(socket(family, type, 0)) {
    sockaddr_in6 address{};
    address.sin6_family = static_cast<sa_family_t>(family);  // all zeros are any address, of either family
    socklen_t size = family == AF_INET ? sizeof(sockaddr_in) : sizeof(sockaddr_in6);
    auto* const plain = reinterpret_cast<sockaddr*>(&address);
    const bool bound = bind(socket_, plain, size) == 0 && getsockname(socket_, plain, &size) == 0;
    if (bound) port_ = ntohs(address.sin6_port);  // at the same place in both
    if (bound && type == SOCK_STREAM) listen(socket_, 1);
  }
  ~Somebody() { close(socket_); }
  Somebody(const Somebody&) = delete;
  Somebody& operator=(const Somebody&) = delete;

  int port() const { return port_; }

 private:
  int socket_;
  int port_ = 0;
};

// One that was free a moment ago.
int FreePort() { return Somebody(AF_INET6, SOCK_STREAM).port(); }

class Ports : public testing::Test {
 protected:
  void Configure(int statd_port, int nlm_port, bool custom) {
    NFSConfRecord record;
    ASSERT_EQ(VORNNFSConfGet(&record), 0);
    record.statd_port = statd_port;
    record.nlm_port = nlm_port;
    record.custom_port_enable = custom ? 1 : 0;
    ASSERT_EQ(VORNNFSConfSet(&record), 0);
  }

  TemporaryRoot root_;
};

TEST_F(Ports, AreNumbersFrom1To65535) {
  for (const int port : {INT_MIN, -1, 0, 65536, INT_MAX}) {
    EXPECT_NE(IsPortConflict("nfs_statd", port, port), 0) << port;
  }
  EXPECT_NE(IsPortConflict("nfs_statd", 40000, 39999), 0) << "a range that ends before it begins";
}

TEST_F(Ports, MayBeGivenWhereNobodyHasThem) {
  const int port = FreePort();
  EXPECT_EQ(IsPortConflict("nfs_statd", port, port), 0);
}

TEST_F(Ports, AreTakenBySocketsOfEveryKind) {
  for (const int family : {AF_INET, AF_INET6}) {
    for (const int type : {SOCK_STREAM, SOCK_DGRAM}) {
      const Somebody somebody(family, type);
      ASSERT_GT(somebody.port(), 0);
      EXPECT_NE(IsPortConflict("nfs_nlm", somebody.port(), somebody.port()), 0) << family << ' ' << type;
      EXPECT_NE(IsPortConflict("nfs_nlm", somebody.port() - 1, somebody.port()), 0) << "as the last of a range";
    }
  }
}

TEST_F(Ports, OfTheProtocolsAreTaken) {
  EXPECT_NE(IsPortConflict("nfs_statd", 111, 111), 0);
  EXPECT_NE(IsPortConflict("nfs_statd", 2049, 2049), 0);
  EXPECT_NE(IsPortConflict("nfs_statd", 2040, 2060), 0);
}

TEST_F(Ports, OfTheAdministratorsSettingsAreTaken) {
  const int mountd = FreePort();
  root_.Write("/etc/nfs.conf", "[mountd]\nport = " + std::to_string(mountd) + "\n");
  EXPECT_NE(IsPortConflict("nfs_statd", mountd, mountd), 0);
}

TEST_F(Ports, OfTheOtherDaemonAreTakenWhileCustomPortsAreOn) {
  const int statd = FreePort();
  const int nlm = FreePort();
  if (statd == nlm) GTEST_SKIP() << "the system gave the same port twice";
  Configure(statd, nlm, true);
  EXPECT_NE(IsPortConflict("nfs_nlm", statd, statd), 0);
  EXPECT_NE(IsPortConflict("nfs_statd", nlm, nlm), 0);
  EXPECT_EQ(IsPortConflict("nfs_statd", statd, statd), 0) << "its own";
  Configure(statd, nlm, false);
  EXPECT_EQ(IsPortConflict("nfs_nlm", statd, statd), 0);
}

TEST_F(Ports, AreNotGivenAwayWhenTheSettingsCannotBeRead) {
  root_.Write("/etc/nfs.conf.d/vorn.conf", "[vorn]\nstatd-port = many\n");
  const int port = FreePort();
  EXPECT_NE(IsPortConflict("nfs_statd", port, port), 0);
}

}  // namespace
