// WebUtils::IsPortConflict, in a network namespace of the test.
#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <cerrno>

#include "core.h"
#include "file_descriptor.h"
#include "nfsconf.h"
#include "stand_in_rpcbind.h"
#include "temporary_root.h"
#include "webapi.h"

namespace {

using WebUtils::IsPortConflict;

constexpr unsigned long kStatusProgram = 100024;
constexpr unsigned long kLockProgram = 100021;

// A listening socket on all addresses.
vorn::FileDescriptor Listen(int family, int type, int port) {
  vorn::FileDescriptor descriptor(socket(family, type, 0));
  const int on = 1;
  sockaddr_storage address{};
  address.ss_family = static_cast<sa_family_t>(family);
  if (family == AF_INET6) {
    setsockopt(descriptor.get(), IPPROTO_IPV6, IPV6_V6ONLY, &on, sizeof on);
    reinterpret_cast<sockaddr_in6*>(&address)->sin6_port = htons(static_cast<std::uint16_t>(port));
  } else {
    reinterpret_cast<sockaddr_in*>(&address)->sin_port = htons(static_cast<std::uint16_t>(port));
  }
  setsockopt(descriptor.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
  EXPECT_EQ(bind(descriptor.get(), reinterpret_cast<sockaddr*>(&address), sizeof address), 0) << port;
  EXPECT_TRUE(type != SOCK_STREAM || listen(descriptor.get(), 1) == 0) << port;
  return descriptor;
}

TEST(PortConflict, IsEverythingThatIsNoPort) {
  const TemporaryRoot root;
  const struct {
    int first;
    int last;
    int conflict;
  } cases[] = {
      {0, 0, 1},    {-1, -1, 1},     {1, 1, 0},       {65535, 65535, 0},      {65536, 65536, 1},    {65535, 65536, 1},
      {0, 4000, 1}, {4001, 4000, 1}, {4000, 4001, 0}, {-2147483647, 4000, 1}, {4000, 2147483647, 1}};
  for (const auto& c : cases) EXPECT_EQ(IsPortConflict("nfs_statd", c.first, c.last), c.conflict) << c.first;
}

TEST(PortConflict, IsAListeningSocketOfAnyKind) {
  const TemporaryRoot root;
  for (const int family : {AF_INET, AF_INET6}) {
    for (const int type : {SOCK_STREAM, SOCK_DGRAM}) {
      SCOPED_TRACE(std::to_string(family) + " " + std::to_string(type));
      const vorn::FileDescriptor socket = Listen(family, type, 5000);
      EXPECT_EQ(IsPortConflict("nfs_statd", 5000, 5000), 1);
      EXPECT_EQ(IsPortConflict("nfs_statd", 4990, 5000), 1);
      EXPECT_EQ(IsPortConflict("nfs_statd", 5000, 5010), 1);
      EXPECT_EQ(IsPortConflict("nfs_statd", 4999, 4999), 0);
      EXPECT_EQ(IsPortConflict("nfs_statd", 5001, 5001), 0);
    }
  }
  EXPECT_EQ(IsPortConflict("nfs_statd", 5000, 5000), 0) << "the socket is closed";
}

TEST(PortConflict, IsNotTheServicesOwnSocket) {
  const TemporaryRoot root;
  const StandInRpcbind rpcbind({{100000, "tcp", "0.0.0.0.0.111"},
                                {100000, "local", "/run/rpcbind.sock"},
                                {kStatusProgram, "tcp", "0.0.0.0.15.160"},
                                {kStatusProgram, "tcp6", "::.15.160"},
                                {kStatusProgram, "udp6", "::.15.161"},
                                {kLockProgram, "tcp", "0.0.0.0.15.162"}});
  const vorn::FileDescriptor sockets[] = {Listen(AF_INET, SOCK_STREAM, 4000), Listen(AF_INET6, SOCK_STREAM, 4000),
                                          Listen(AF_INET, SOCK_DGRAM, 4001), Listen(AF_INET, SOCK_STREAM, 4002)};
  EXPECT_EQ(IsPortConflict("nfs_statd", 4000, 4000), 0);
  EXPECT_EQ(IsPortConflict("nfs_statd", 4001, 4001), 0);
  EXPECT_EQ(IsPortConflict("nfs_statd", 4002, 4002), 0) << "the lock manager's: ports can be exchanged";
  EXPECT_EQ(IsPortConflict("nfs_nlm", 4002, 4002), 0);
  EXPECT_EQ(IsPortConflict("nfs_nlm", 4000, 4000), 0) << "the status daemon's: ports can be exchanged";
  EXPECT_EQ(IsPortConflict("nfs_mountd", 4000, 4000), 1);
  EXPECT_EQ(IsPortConflict("rpcbind", 4000, 4000), 1) << "a service without a program";
  const vorn::FileDescriptor foreign = Listen(AF_INET, SOCK_DGRAM, 4000);
  EXPECT_EQ(IsPortConflict("nfs_statd", 4000, 4000), 1) << "somebody else's, of the other protocol";
}

TEST(PortConflict, IsTheConfiguredPortOfAnotherService) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[nfsd]\nport = 20490\n[mountd]\nport = 20000\n");
  root.Write("/etc/nfs.conf.d/site.conf", "[mountd]\nport = 20048\n");
  NFSConfRecord record{};
  record.statd_port = 4000;
  record.nlm_port = 4001;
  const struct {
    const char* service;
    int port;
    bool custom_ports;
    int conflict;
  } cases[] = {{"nfs_statd", 111, true, 1},   {"nfs_statd", 20490, true, 1}, {"nfs_statd", 2049, true, 0},
               {"nfs_statd", 20048, true, 1}, {"nfs_statd", 20000, true, 0}, {"nfs_statd", 4000, true, 0},
               {"nfs_statd", 4001, true, 0},  {"nfs_nlm", 4000, true, 0},    {"nfs_nlm", 4001, true, 0},
               {"nfs_statd", 4001, false, 0}, {"nfs_nlm", 4000, false, 0},   {"nfs_mountd", 4001, true, 1},
               {"nfs_mountd", 4001, false, 0}};
  for (const auto& c : cases) {
    record.custom_port_enable = c.custom_ports ? 1 : 0;
    ASSERT_EQ(VORNNFSConfSet(&record), 0);
    EXPECT_EQ(IsPortConflict(c.service, c.port, c.port), c.conflict) << c.service << " " << c.port;
  }
}

TEST(PortConflict, ReadsAPortAsItsDaemonDoes) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[mountd]\nport = 4000x\n[nfsd]\nport = many\n");
  EXPECT_EQ(IsPortConflict("nfs_statd", 4000, 4000), 1);
  EXPECT_EQ(IsPortConflict("nfs_statd", 4001, 4001), 0);
}

TEST(PortConflict, IsAPortThatCannotBeChecked) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf/x", "");
  EXPECT_EQ(IsPortConflict("nfs_statd", 4000, 4000), 1);
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
}

}  // namespace
