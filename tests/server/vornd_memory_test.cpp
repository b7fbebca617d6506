// The real vornd with failing allocations: each failure ends only the call or connection that made the allocation.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/resource.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <optional>
#include <stdexcept>
#include <vector>

#include "allocation_faults.h"
#include "server_process.h"

namespace vorn::server {
namespace {

std::string Form() {
  const std::string form =
      "--b\r\nContent-Disposition: form-data; name=keytab_file; filename=k\r\n\r\nkeytab\r\n"
      "--b\r\nContent-Disposition: form-data; name=note\r\n\r\na text of more than a few bytes\r\n--b--\r\n";
  return "POST /api/Test.Echo/v1/upload HTTP/1.1\r\nHost: localhost\r\nContent-Type: multipart/form-data; "
         "boundary=b\r\n"
         "Content-Length: " +
         std::to_string(form.size()) + "\r\n\r\n" + form;
}

// Requests that take different code paths on a worker thread.
std::vector<std::string> Requests() {
  return {Post("/api/Test.Echo/v1/get", R"({"a": ["text that is not short any more", 1, {"b": null}]})"),
          Post("/api/Test.Echo/v1/get", R"({"a": 1, "a": 2})"),
          Post("/api/Test.Echo/v1/fail", R"({"code": 2351, "details": ["alice"]})"),
          Post("/api/Test.Echo/v1/remark", R"({"code": 2301, "reasons": ["a"], "warnings": ["b"]})"),
          Post("/api/Test.Echo/v1/throw"),
          Form()};
}

// A vornd with the allocator of preload/failing_malloc.cpp.
class FailingAllocator : public testing::Test {
 protected:
  FailingAllocator() {
    const std::string path = sandbox_.File("faults");
    sandbox_.Write("faults", std::string(sizeof(AllocationFaults), '\0'));
    const UniqueFd file(open(path.c_str(), O_RDWR | O_CLOEXEC));
    void* page = mmap(nullptr, sizeof(AllocationFaults), PROT_READ | PROT_WRITE, MAP_SHARED, file.get(), 0);
    if (page == MAP_FAILED) throw std::runtime_error("mmap");
    faults_ = static_cast<AllocationFaults*>(page);
    setenv("VORN_TEST_ALLOCATION_FAULTS", path.c_str(), 1);
    setenv("LD_PRELOAD", FAILING_MALLOC, 1);
    server_.emplace(sandbox_);
    unsetenv("LD_PRELOAD");
  }
  ~FailingAllocator() override {
    faults_->countdown = 0;
    server_->Signal(SIGTERM);
    EXPECT_EQ(server_->Wait(), 0) << server_->log();
    munmap(faults_, sizeof(AllocationFaults));
  }

  // Makes the n-th allocation from now on fail while the request is served. Returns whether it was reached.
  bool Try(const std::string& request, int n, bool stay) {
    faults_->failed = 0;
    faults_->stay = stay;
    Connection client = server_->Connect();
    faults_->countdown = n;
    client.Send(request);
    const auto answer = client.Receive();
    faults_->countdown = 0;
    const int status = answer.status;
    const bool failed = faults_->failed > 0;
    EXPECT_TRUE(status >= 200) << "no answer: allocation " << n << " of " << request.substr(0, 60);
    EXPECT_TRUE(status != 200 || answer.Envelope().isObject()) << "allocation " << n << ": " << answer.body;
    EXPECT_TRUE(failed || status < 500 || request.find("throw") != std::string::npos) << status;
    return failed;
  }
  // Like Try(), on a connection that has served a request before, while another connection is open.
  bool TryConnection(const std::string& request, int n, bool stay) {
    Connection other = ConnectAndAsk();
    Connection client = ConnectAndAsk();  // when this one is accepted, the server is done with the request of the other
    faults_->failed = 0;
    faults_->stay = stay;
    faults_->countdown = n;
    client.Send(request);
    client.FinishSending();
    const std::string answer = client.ReceiveAll();
    faults_->countdown = 0;
    other.Send(Post("/api/Test.Echo/v1/get", R"({"a": 1})"));
    EXPECT_EQ(other.Receive().status, 200) << "allocation " << n << " of " << request.substr(0, 60);
    EXPECT_EQ(answer.find("(open)"), std::string::npos) << "allocation " << n << " of " << request.substr(0, 60);
    return faults_->failed > 0;
  }
  Connection ConnectAndAsk() {
    Connection client = server_->Connect();
    client.Send(Get("/healthz"));
    EXPECT_EQ(client.Receive().status, 200);
    return client;
  }
  void ExpectHealthy() {
    Connection client = server_->Connect();
    client.Send(Post("/api/Test.Echo/v1/get", R"({"a": 1})"));
    EXPECT_EQ(client.Receive().Envelope()["data"]["a"], 1);
  }

  Sandbox sandbox_;
  AllocationFaults* faults_ = nullptr;
  std::optional<ServerProcess> server_;
};

TEST_F(FailingAllocator, EndsTheCallThatFindsNoMemoryAndNoOther) {
  faults_->thread = 'w';  // workers
  for (const bool stay : {false, true}) {
    for (const std::string& request : Requests()) {
      int n = 1;
      while (n < 2000 && Try(request, n, stay)) ++n;
      EXPECT_GT(n, 5) << request.substr(0, 60);
      EXPECT_LT(n, 2000) << request.substr(0, 60);
      ExpectHealthy();
    }
  }
  EXPECT_TRUE(std::filesystem::is_empty(sandbox_.File("run/vorn/uploads")));
}

// Requests that take different code paths on the network thread.
std::vector<std::string> NetworkRequests() {
  std::vector<std::string> requests = Requests();
  for (const std::string& request :
       {Get("/api"), Get("/healthz/ready"), Get("/nothing"), std::string("GET / HTTP/9\r\n\r\n"),
        Post("/api/Test.Echo/v1/get", R"({"a": ")" + std::string(20000, 'x') + "\"}"),
        Post("/api/Test.Echo/v1/get", R"({"a": 1})", "Expect: 100-continue\r\n"),
        Post("/api/Test.Echo/v1/get", R"({"a": 1})", "Connection: close\r\n")}) {
    requests.push_back(request);
  }
  return requests;
}

// The connection may end without an answer, but it ends, and the other connection stays open.
TEST_F(FailingAllocator, EndsTheConnectionThatFindsNoMemoryAndNoOther) {
  for (const char thread : {'n', '\0'}) {  // the network thread; all threads
    faults_->thread = thread;
    for (const bool stay : {false, true}) {
      for (const std::string& request : NetworkRequests()) {
        int n = 1;
        while (n < 2000 && TryConnection(request, n, stay)) ++n;
        EXPECT_GT(n, 5) << request.substr(0, 60);
        EXPECT_LT(n, 2000) << request.substr(0, 60);
      }
    }
  }
}

TEST_F(FailingAllocator, StopsWithoutMemory) {
  if (COUNTS_COVERAGE) GTEST_SKIP() << "gcov cannot write its counts without memory, and ends the process";
  const Connection idle = ConnectAndAsk();
  faults_->stay = true;
  faults_->countdown = 1;
  server_->Signal(SIGTERM);
  EXPECT_EQ(server_->Wait(), 0) << server_->log();
}

// Without memory no connection is accepted; once there is memory again, connections are accepted.
TEST_F(FailingAllocator, AcceptsConnectionsAgainOnceThereIsMemory) {
  faults_->thread = 'n';
  for (int n = 1; n < 20; ++n) {
    faults_->stay = true;
    faults_->failed = 0;
    faults_->countdown = n;
    std::vector<Connection> clients;
    for (int i = 0; i < 3; ++i) clients.push_back(server_->ConnectTcp());
    EXPECT_TRUE(Eventually([this] { return faults_->failed > 0; })) << n;
    faults_->countdown = 0;
    ExpectHealthy();
  }
}

// Returns the private writable memory of a process. Its address space is no measure of it, because the C library
// reserves 64 MiB of address space for the threads' allocations.
std::uint64_t DataOf(pid_t pid) {
  std::uint64_t pages = 0;  // the sixth number (proc(5))
  std::ifstream file("/proc/" + std::to_string(pid) + "/statm");
  for (int i = 0; i < 6; ++i) file >> pages;
  return pages * static_cast<std::uint64_t>(sysconf(_SC_PAGESIZE));
}

std::string LargestJson() {
  std::string text = R"({"a":[[])";
  for (int i = 0; i < 99000; ++i) text += ",[]";
  return text + "]}";
}

// Returns the largest amount of memory that a process has had, in bytes (VmHWM, proc(5)).
std::uint64_t LargestMemoryOf(pid_t pid) {
  std::ifstream file("/proc/" + std::to_string(pid) + "/status");
  for (std::string word; file >> word;) {
    std::uint64_t kilobytes = 0;
    if (word == "VmHWM:" && file >> kilobytes) return kilobytes * 1024;
  }
  return 0;
}

// A value of LargestJson() takes at least 160 bytes. The method has the parameters, a copy, and the copy that it
// answers with; the server must add none.
TEST(LargestCall, HasThreeCopiesOfItsParameters) {
  constexpr std::uint64_t kCopy = std::uint64_t{160} * 99000;
  const Sandbox sandbox;
  const ServerProcess server(sandbox);
  const std::uint64_t before = LargestMemoryOf(server.pid());
  Connection client = server.Connect();
  client.Send(Post("/api/Test.Echo/v1/get", LargestJson()));
  EXPECT_EQ(client.Receive().status, 200);
  const std::uint64_t taken = LargestMemoryOf(server.pid()) - before;
  EXPECT_GT(taken, 2 * kCopy);
  EXPECT_LT(taken, 7 * kCopy / 2);
}

TEST(MemoryLimit, EndsCallsAndNotTheServer) {
  const Sandbox sandbox;
  ServerProcess server(sandbox);
  const std::string request = Post("/api/Test.Echo/v1/get", LargestJson());
  const rlim_t limit = DataOf(server.pid()) + rlim_t{12} * 1024 * 1024;
  const rlimit limits{limit, limit};
  ASSERT_EQ(prlimit(server.pid(), RLIMIT_DATA, &limits, nullptr), 0);
  int refused = 0;
  for (int round = 0; round < 3; ++round) {
    std::vector<Connection> clients;
    for (int i = 0; i < 8; ++i) {
      clients.push_back(server.Connect());
      clients.back().Send(request);
    }
    for (Connection& client : clients) {
      if (client.Receive().status != 200) ++refused;
    }
  }
  EXPECT_GT(refused, 0) << "the limit must be reached";
  const auto healthy = [&server] {
    Connection client = server.Connect();
    client.Send(Post("/api/Test.Echo/v1/get", R"({"a": 1})"));
    return client.Receive().status == 200;
  };
  EXPECT_TRUE(Eventually(healthy)) << server.log();
  server.Signal(SIGTERM);
  EXPECT_EQ(server.Wait(), 0) << server.log();
}

}  // namespace
}  // namespace vorn::server
