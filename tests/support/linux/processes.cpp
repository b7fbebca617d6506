#include "processes.h"

#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <memory>
#include <stdexcept>
#include <thread>

namespace {

using OwnedFile = std::unique_ptr<FILE, int (*)(FILE*)>;

OwnedFile Scratch() {
  OwnedFile file(std::tmpfile(), &std::fclose);
  if (file == nullptr) throw std::runtime_error("no temporary file");
  return file;
}

std::string ReadFromStart(FILE* file) {
  std::rewind(file);
  std::string text;
  char buffer[4096];
  while (const std::size_t size = std::fread(buffer, 1, sizeof buffer, file)) text.append(buffer, size);
  return text;
}

void AddSystemProgramsToPath() {
  const char* variable = std::getenv("PATH");
  const std::string path = variable == nullptr ? "" : variable;
  if (path.find("/usr/sbin") == std::string::npos) setenv("PATH", (path + ":/usr/sbin:/sbin").c_str(), 1);
}

int StatusOf(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) return -1;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

int Spawn(const std::vector<std::string>& arguments, FILE* output, FILE* errors) {
  std::vector<char*> argv;
  argv.reserve(arguments.size() + 1);
  for (const std::string& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
  argv.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", 0, 0);
  posix_spawn_file_actions_adddup2(&actions, fileno(output), STDOUT_FILENO);
  posix_spawn_file_actions_adddup2(&actions, fileno(errors), STDERR_FILENO);
  pid_t child = -1;
  const int error = posix_spawnp(&child, argv[0], &actions, nullptr, argv.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (error != 0) throw std::runtime_error("cannot run " + arguments.front());
  return StatusOf(child);
}

}  // namespace

ProgramResult RunProgram(const std::vector<std::string>& arguments) {
  AddSystemProgramsToPath();
  const OwnedFile output = Scratch();
  const OwnedFile errors = Scratch();
  const int status = Spawn(arguments, output.get(), errors.get());
  return {status, ReadFromStart(output.get()), ReadFromStart(errors.get())};
}

ChildProcess::ChildProcess(const std::function<int()>& body) : id_(fork()) {
  if (id_ < 0) throw std::runtime_error("cannot fork");
  if (id_ > 0) return;
  try {
    _exit(body());
  } catch (const std::exception& error) {
    std::fprintf(stderr, "child: %s\n", error.what());
    _exit(99);
  }
}

ChildProcess::~ChildProcess() {
  if (id_ < 0) return;
  Kill();
  Wait();
}

void ChildProcess::Kill() { kill(id_, SIGKILL); }

int ChildProcess::Wait() {
  const int status = StatusOf(id_);
  id_ = -1;
  return status;
}

bool Eventually(const std::function<bool()>& condition) {
  const auto limit = std::chrono::steady_clock::now() + std::chrono::minutes(1);
  while (!condition()) {
    if (std::chrono::steady_clock::now() > limit) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return true;
}
