#include "helper_process.h"

#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <utility>

#include "secret.h"

namespace vorn::server {
namespace {

// The attributes and file actions of posix_spawn(3).
class SpawnPlan {
 public:
  // `input` becomes the standard input. The process has a process group of its own and the default signal handling:
  // vornd ignores SIGPIPE, which a program inherits.
  explicit SpawnPlan(int input) {
    posix_spawn_file_actions_init(&actions_);
    posix_spawnattr_init(&attributes_);
    posix_spawn_file_actions_adddup2(&actions_, input, STDIN_FILENO);
    sigset_t signals{};
    sigemptyset(&signals);
    posix_spawnattr_setsigmask(&attributes_, &signals);
    sigaddset(&signals, SIGPIPE);
    posix_spawnattr_setsigdefault(&attributes_, &signals);
    posix_spawnattr_setpgroup(&attributes_, 0);
    posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETPGROUP);
  }
  ~SpawnPlan() {
    posix_spawn_file_actions_destroy(&actions_);
    posix_spawnattr_destroy(&attributes_);
  }
  SpawnPlan(const SpawnPlan&) = delete;
  SpawnPlan& operator=(const SpawnPlan&) = delete;

  // Returns 0 or an error number.
  int Start(std::vector<std::string> command, pid_t* pid) const {
    std::vector<char*> arguments;
    arguments.reserve(command.size() + 1);
    for (std::string& word : command) arguments.push_back(word.data());
    arguments.push_back(nullptr);
    return posix_spawn(pid, arguments[0], &actions_, &attributes_, arguments.data(), environ);
  }

 private:
  posix_spawn_file_actions_t actions_{};
  posix_spawnattr_t attributes_{};
};

}  // namespace

std::optional<HelperProcess> HelperProcess::Start(const std::vector<std::string>& command,
                                                  const PasswordRequest& request, std::string* error) {
  int ends[2] = {-1, -1};
  if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) {
    *error = std::strerror(errno);
    return std::nullopt;
  }
  UniqueFd own(ends[0]);
  const UniqueFd other(ends[1]);
  pid_t pid = -1;
  if (const int failure = SpawnPlan(other.get()).Start(command, &pid); failure != 0) {
    *error = command[0] + ": " + std::strerror(failure);
    return std::nullopt;
  }
  HelperProcess process(pid, std::move(own));
  std::string message = FormatRequest(request);
  const ssize_t sent = send(process.descriptor(), message.data(), message.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
  Wipe(&message);
  if (sent > 0) return process;
  *error = command[0] + ": " + std::strerror(errno);
  return std::nullopt;
}

HelperProcess::HelperProcess(HelperProcess&& other) noexcept
    : pid_(std::exchange(other.pid_, -1)), socket_(std::move(other.socket_)) {}

HelperProcess::~HelperProcess() {
  if (pid_ <= 0) return;
  kill(-pid_, SIGKILL);
  while (waitpid(pid_, nullptr, 0) < 0 && errno == EINTR) {
  }
}

std::optional<PasswordVerdict> HelperProcess::Verdict() const {
  char message[kMaxMessage];
  const ssize_t size = recv(descriptor(), message, sizeof message, MSG_DONTWAIT);
  if (size < 0 && (errno == EAGAIN || errno == EINTR)) return std::nullopt;
  if (size <= 0) return PasswordVerdict{};
  return ParseVerdict({message, static_cast<std::size_t>(size)});
}

}  // namespace vorn::server
