#include "program.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "file_descriptor.h"

namespace vorn {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t kLongestLine = 1024;  // a longer one is cut into several

constexpr std::size_t kReadSize = 4096;
constexpr int kMostReads = 16;  // pipe(7): a pipe holds 64 KiB

// Collects output and passes it on line by line.
class LineSplitter {
 public:
  explicit LineSplitter(const std::function<void(std::string_view)>& line) : line_(line) {}
  ~LineSplitter() {
    if (!rest_.empty()) line_(rest_);
  }
  LineSplitter(const LineSplitter&) = delete;
  LineSplitter& operator=(const LineSplitter&) = delete;

  void Take(std::string_view text) {
    for (const char c : text) {
      if (c != '\n') rest_.push_back(c);
      if (c != '\n' && rest_.size() < kLongestLine) continue;
      line_(rest_);
      rest_.clear();
    }
  }

 private:
  const std::function<void(std::string_view)>& line_;
  std::string rest_;
};

// The file actions and attributes of a posix_spawn(3).
class SpawnPlan {
 public:
  explicit SpawnPlan(int output) {
    posix_spawn_file_actions_init(&actions_);
    posix_spawn_file_actions_addopen(&actions_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&actions_, output, STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions_, output, STDERR_FILENO);
    posix_spawn_file_actions_addclosefrom_np(&actions_, STDERR_FILENO + 1);
    posix_spawnattr_init(&attributes_);
    sigset_t signals;
    sigemptyset(&signals);
    posix_spawnattr_setsigmask(&attributes_, &signals);
    sigfillset(&signals);
    posix_spawnattr_setsigdefault(&attributes_, &signals);
    posix_spawnattr_setpgroup(&attributes_, 0);
    posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETPGROUP | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSIGMASK);
  }
  ~SpawnPlan() {
    posix_spawn_file_actions_destroy(&actions_);
    posix_spawnattr_destroy(&attributes_);
  }
  SpawnPlan(const SpawnPlan&) = delete;
  SpawnPlan& operator=(const SpawnPlan&) = delete;

  const posix_spawn_file_actions_t* actions() const { return &actions_; }
  const posix_spawnattr_t* attributes() const { return &attributes_; }

 private:
  posix_spawn_file_actions_t actions_{};
  posix_spawnattr_t attributes_{};
};

std::vector<char*> Pointers(std::vector<std::string>* texts) {
  std::vector<char*> pointers;
  for (std::string& text : *texts) pointers.push_back(text.data());
  pointers.push_back(nullptr);
  return pointers;
}

// A running program and the read end of its output pipe.
class Child {
 public:
  static Result<Child> Start(const std::string& path, const std::vector<std::string>& arguments,
                             const std::string& root) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) return Status::System(errno, "pipe");
    FileDescriptor output(ends[0]);
    const FileDescriptor input(ends[1]);
    std::vector<std::string> words{path};
    words.insert(words.end(), arguments.begin(), arguments.end());
    std::vector<std::string> environment{"PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
                                         "LANG=C.UTF-8", "VORN_ROOT=" + root};
    const SpawnPlan plan(input.get());
    pid_t id = -1;
    const int error = posix_spawn(&id, path.c_str(), plan.actions(), plan.attributes(), Pointers(&words).data(),
                                  Pointers(&environment).data());
    if (error != 0) return Status::System(error, path);
    fcntl(output.get(), F_SETFL, O_NONBLOCK);
    FileDescriptor process(static_cast<int>(syscall(SYS_pidfd_open, id, 0)));
    const int process_error = errno;
    Child child(id, std::move(output), std::move(process));
    if (child.process_) return child;
    child.Signal(SIGKILL);
    child.Reap();
    return Status::System(process_error, path);
  }

  // Reads output until the program has ended or the time is over. Returns whether it has ended.
  bool Follow(std::chrono::milliseconds limit, LineSplitter* lines) {
    const auto deadline = Clock::now() + limit;
    for (;;) {
      const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
      // After the program's end the pipe may still be full. The number of reads is bounded, because a grandchild
      // may go on writing.
      pollfd events[] = {{process_.get(), POLLIN, 0}, {output_.get(), POLLIN, 0}};
      poll(events, output_ ? 2 : 1, static_cast<int>(std::max<long long>(left, 0)));
      const bool ended = (events[0].revents & POLLIN) != 0;
      for (int reads = ended ? kMostReads : 1; reads > 0 && Drain(lines); --reads) {
      }
      if (ended) return true;
      if (left <= 0) return false;
    }
  }

  void Signal(int number) const { kill(-id_, number); }

  // Waits for the program, which has ended or was killed. Returns its status as of waitpid(2).
  int Reap() const {
    int status = 0;
    while (waitpid(id_, &status, 0) < 0 && errno == EINTR) {
    }
    return status;
  }

 private:
  Child(pid_t id, FileDescriptor output, FileDescriptor process)
      : id_(id), output_(std::move(output)), process_(std::move(process)) {}

  // Makes one read(2). Returns whether there was any output.
  bool Drain(LineSplitter* lines) {
    char buffer[kReadSize];
    const ssize_t size = read(output_.get(), buffer, sizeof buffer);
    if (size > 0) lines->Take({buffer, static_cast<std::size_t>(size)});
    if (size == 0) output_.Close();
    return size > 0;
  }

  pid_t id_;
  FileDescriptor output_;
  FileDescriptor process_;
};

Status ResultOf(const std::string& path, int status, bool in_time) {
  if (!in_time) return Status::Failure(kProgramFailed, path + " took too long and was ended");
  if (WIFSIGNALED(status)) {
    return Status::Failure(kProgramFailed, path + " was ended by signal " + std::to_string(WTERMSIG(status)));
  }
  if (WEXITSTATUS(status) == 0) return {};
  return Status::Failure(kProgramFailed, path + " exited with status " + std::to_string(WEXITSTATUS(status)));
}

}  // namespace

Status RunProgram(const std::string& path, const std::vector<std::string>& arguments,
                  const std::function<void(std::string_view)>& line, const ProgramOptions& options) {
  Result<Child> child = Child::Start(path, arguments, options.root);
  if (!child.ok()) return child.status();
  LineSplitter lines(line);
  const bool in_time = child->Follow(options.limit, &lines);
  if (!in_time) {
    child->Signal(SIGTERM);
    child->Follow(options.patience, &lines);
    child->Signal(SIGKILL);
  }
  return ResultOf(path, child->Reap(), in_time);
}

}  // namespace vorn
