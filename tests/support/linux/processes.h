// Other programs and other processes, for tests.
#ifndef VORN_TESTS_SUPPORT_LINUX_PROCESSES_H
#define VORN_TESTS_SUPPORT_LINUX_PROCESSES_H

#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

struct ProgramResult {
  int status = -1;  // exit status; 128 and the signal's number after a signal, as a shell has it
  std::string output;
  std::string errors;
};

// Runs a program and waits for its end. The program is searched along PATH and in the folders of system
// programs. Its standard input is empty.
ProgramResult RunProgram(const std::vector<std::string>& arguments);

// A child of this process that runs a function and ends with its result as exit status. The destructor
// kills it. Construct it before any thread is started.
class ChildProcess {
 public:
  explicit ChildProcess(const std::function<int()>& body);
  ~ChildProcess();
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;

  pid_t id() const { return id_; }
  void Kill();
  int Wait();  // status as of ProgramResult

 private:
  pid_t id_ = -1;
};

// Polls `condition` until it is true. Returns false after a minute.
bool Eventually(const std::function<bool()>& condition);

#endif  // VORN_TESTS_SUPPORT_LINUX_PROCESSES_H
