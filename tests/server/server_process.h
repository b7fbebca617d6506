// The real vornd, in a temporary root.
#ifndef VORN_TESTS_SERVER_SERVER_PROCESS_H
#define VORN_TESTS_SERVER_SERVER_PROCESS_H

#include <sys/types.h>

#include <string>
#include <vector>

#include "connection.h"
#include "sandbox.h"
#include "unique_fd.h"

namespace vorn::server {

class ServerProcess {
 public:
  // Starts vornd with --root, the test modules and `arguments`. Without arguments it listens at its
  // default socket and at a free port of 127.0.0.1. Returns when vornd is ready or has ended.
  explicit ServerProcess(const Sandbox& sandbox, std::vector<std::string> arguments = {});
  ~ServerProcess();  // kills it if it still runs
  ServerProcess(const ServerProcess&) = delete;
  ServerProcess& operator=(const ServerProcess&) = delete;

  bool ready() const { return ready_; }
  pid_t pid() const { return pid_; }
  std::string socket() const { return sandbox_.File("run/vorn/vornd.sock"); }
  int port() const;         // that it listens at; 0 if none
  std::string log() const;  // so far

  Connection Connect() const { return Connection::ToUnix(socket()); }
  Connection ConnectTcp() const { return Connection::ToPort(port()); }

  void Signal(int number) const;

  // Waits for its end. Returns the exit status, or 128 plus the number of the signal that ended it.
  int Wait();

 private:
  void Start(const std::vector<std::string>& arguments);
  bool HasEnded();
  void AwaitReady();

  const Sandbox& sandbox_;
  UniqueFd notifications_;
  std::string notify_path_;
  std::string log_path_;
  pid_t pid_ = -1;
  int status_ = -1;  // negative while it runs
  bool ready_ = false;
};

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_SERVER_PROCESS_H
