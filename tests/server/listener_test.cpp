#include "listener.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <filesystem>

#include "connection.h"
#include "sandbox.h"

namespace vorn::server {
namespace {

std::string Refused(const std::string& address) {
  std::string error;
  return OpenListener(address, &error) ? "(opened)" : error;
}

TEST(Listener, OpensAUnixSocketForAllLocalUsers) {
  const Sandbox sandbox;
  const std::string path = sandbox.File("s");
  std::string error;
  {
    const auto listener = OpenListener("unix:" + path, &error);
    ASSERT_TRUE(listener) << error;
    EXPECT_EQ(listener->name(), "unix:" + path);
    EXPECT_EQ(listener->family(), AF_UNIX);
    struct stat there {};
    ASSERT_EQ(stat(path.c_str(), &there), 0);
    EXPECT_EQ(there.st_mode & 07777, 0666U);
    EXPECT_TRUE(Connection::ToUnix(path).connected());
  }
  EXPECT_FALSE(std::filesystem::exists(path)) << "removed with the listener";
}

TEST(Listener, ReplacesASocketWithoutAServer) {
  const Sandbox sandbox;
  const std::string address = "unix:" + sandbox.File("s");
  std::string error;
  OpenListener(address, &error)->TakeSocket();
  const auto gone = OpenListener(address, &error);
  EXPECT_TRUE(gone) << error;
}

TEST(Listener, LeavesASocketThatIsServed) {
  const Sandbox sandbox;
  const std::string address = "unix:" + sandbox.File("s");
  std::string error;
  const auto first = OpenListener(address, &error);
  EXPECT_EQ(Refused(address), sandbox.File("s") + " is served by another program");
  EXPECT_TRUE(Connection::ToUnix(sandbox.File("s")).connected());
}

TEST(Listener, LeavesAFileThatIsNoSocket) {
  const Sandbox sandbox;
  sandbox.Write("s", "precious");
  EXPECT_EQ(Refused("unix:" + sandbox.File("s")), sandbox.File("s") + " is there and is no socket");
  EXPECT_EQ(ReadWholeFile(sandbox.File("s")), "precious");
}

TEST(Listener, OpensLoopback) {
  std::string error;
  auto ipv4 = OpenListener("127.0.0.1:0", &error);
  ASSERT_TRUE(ipv4) << error;
  EXPECT_TRUE(Connection::ToPort(std::atoi(ipv4->name().c_str() + sizeof "127.0.0.1:" - 1)).connected());
  EXPECT_NE(Refused(ipv4->name()).find("Address already in use"), std::string::npos);
}

TEST(Listener, RefusesEveryOtherAddress) {
  for (const char* address : {"",
                              "0.0.0.0:80",
                              "[::]:80",
                              "::1:80",
                              "127.0.0.1",
                              "127.0.0.1:",
                              "127.0.0.1:65536",
                              "127.0.0.1:-1",
                              "127.0.0.1:x",
                              "127.0.0.2:80",
                              "localhost:80",
                              "192.0.2.1:80",
                              ":80",
                              "80",
                              "/run/s",
                              "tcp:127.0.0.1:80",
                              "tls:nas:443",
                              "tls:443",
                              "tls:::1:443",
                              "tls:[::1]",
                              "tls:0.0.0.0:"}) {
    EXPECT_EQ(
        Refused(address),
        "only unix:/PATH, 127.0.0.1:PORT and [::1]:PORT can be listened at without TLS, and tls:ADDRESS:PORT with "
        "TLS")
        << address;
  }
  for (const std::string& address : {std::string("unix:"), std::string("unix:s"), "unix:/" + std::string(107, 'x')}) {
    EXPECT_EQ(Refused(address), "the path of a socket is absolute and at most 107 bytes") << address;
  }
}

TEST(Listener, OpensAnyAddressWithTls) {
  std::string error;
  for (const char* address : {"tls:0.0.0.0:0", "tls:[::]:0", "tls:127.0.0.2:0"}) {
    const auto listener = OpenListener(address, &error);
    ASSERT_TRUE(listener) << error;
    EXPECT_TRUE(listener->tls());
    EXPECT_EQ(listener->name().rfind(std::string(address).substr(0, std::string(address).size() - 1), 0), 0U)
        << address;
  }
  EXPECT_FALSE(OpenListener("127.0.0.1:0", &error)->tls());
}

TEST(Listener, AdoptsListeningSocketsUnderTheSameRules) {
  std::string error;
  auto tcp = OpenListener("127.0.0.1:0", &error);
  ASSERT_TRUE(tcp) << error;
  const UniqueFd socket_of_tcp = tcp->TakeSocket();
  EXPECT_TRUE(AdoptListener(UniqueFd(dup(socket_of_tcp.get())), &error)) << error;
  EXPECT_FALSE(AdoptListener(UniqueFd(socket(AF_UNIX, SOCK_STREAM, 0)), &error));
  EXPECT_EQ(error, "not a listening stream socket");
  EXPECT_FALSE(AdoptListener(UniqueFd(open("/dev/null", O_RDONLY)), &error));
}

}  // namespace
}  // namespace vorn::server
