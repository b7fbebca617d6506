#include "server_process.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <regex>

#include "private_file.h"
#include "secret.h"
#include "token_file.h"

namespace vorn::server {
namespace {

UniqueFd OpenNotifySocket(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  path.copy(address.sun_path, sizeof address.sun_path - 1);
  UniqueFd socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  unlink(path.c_str());
  if (bind(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) return {};
  return socket;
}

[[noreturn]] void Execute(const std::string& notify_path, const std::string& log_path, const std::string& output,
                          std::vector<std::string> words) {
  const int log = open(log_path.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
  dup2(log, STDERR_FILENO);
  if (!output.empty()) dup2(open(output.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600), STDOUT_FILENO);
  setenv("NOTIFY_SOCKET", notify_path.c_str(), 1);
  unsetenv("SYSTEMD_EXEC_PID");
  std::vector<char*> arguments;
  for (std::string& word : words) arguments.push_back(word.data());
  arguments.push_back(nullptr);
  execv(arguments[0], arguments.data());
  _exit(127);
}

}  // namespace

ServerProcess::ServerProcess(const Sandbox& sandbox, std::vector<std::string> arguments, std::string output)
    : sandbox_(sandbox),
      notify_path_(sandbox.File("notify")),
      log_path_(sandbox.File("log-" + std::to_string(rand()))),
      output_(std::move(output)) {
  notifications_ = OpenNotifySocket(notify_path_);
  if (arguments.empty()) arguments = {"--listen", "unix:" + socket(), "--listen", "127.0.0.1:0"};
  StoreToken();
  arguments.insert(arguments.begin(), {VORND, "--root", sandbox.path(), "--modules", TEST_MODULES});
  Start(arguments);
  AwaitReady();
}

ServerProcess::~ServerProcess() {
  if (!HasEnded()) {
    Signal(SIGKILL);
    Wait();
  }
  const std::string text = log();
  EXPECT_FALSE(std::regex_search(text, std::regex("vorn[sc]?_[0-9a-f]{16}"))) << "a secret is logged";
  EXPECT_EQ(text.find(kPasswordMark), std::string::npos) << "a password is logged";
}

const std::string& ServerProcess::Token() {
  static const std::string token = NewSecret(kTokenPrefix);
  return token;
}

// A file that a test has written stays.
void ServerProcess::StoreToken() const {
  const std::string path = sandbox_.File("var/lib/vorn/tokens.json");
  if (std::filesystem::exists(path)) return;
  vorn::server::Token token;
  token.id = "test";
  token.name = "test";
  token.role = Role::kAdministrator;
  std::error_code ignored;
  std::filesystem::create_directories(sandbox_.File("var/lib/vorn"), ignored);
  std::string error;
  (void)ReplacePrivateFile(path, FormatTokens({{DigestOf(Token()), token}}), &error);
}

void ServerProcess::Start(const std::vector<std::string>& arguments) {
  pid_ = fork();
  if (pid_ == 0) Execute(notify_path_, log_path_, output_, arguments);
}

void ServerProcess::AwaitReady() {
  Eventually([this] {
    char text[256] = "";
    if (recv(notifications_.get(), text, sizeof text - 1, MSG_DONTWAIT) > 0)
      ready_ = std::strstr(text, "READY=1") != nullptr;
    return ready_ || HasEnded();
  });
}

bool ServerProcess::HasEnded() {
  int status = 0;
  if (status_ < 0 && waitpid(pid_, &status, WNOHANG) == pid_) {
    status_ = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
  }
  return status_ >= 0;
}

int ServerProcess::port() const {
  static const std::string kLine = "Listening at 127.0.0.1:";
  const std::string text = log();
  const std::size_t place = text.find(kLine);
  return place == std::string::npos ? 0 : std::atoi(text.c_str() + place + kLine.size());
}

std::string ServerProcess::log() const { return ReadWholeFile(log_path_); }

void ServerProcess::Signal(int number) const { kill(pid_, number); }

int ServerProcess::Wait() {
  Eventually([this] { return HasEnded(); });
  return status_;
}

}  // namespace vorn::server
