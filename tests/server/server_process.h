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

// All passwords of the tests begin with this.
constexpr const char* kPasswordMark = "Passphrase-of-";

class ServerProcess {
 public:
  // Starts vornd with --root, the test modules and `arguments`. Without arguments it listens at its
  // default socket and at a free port of 127.0.0.1. Returns when vornd is ready or has ended.
  // Its standard output is written to the file `output`, if one is named.
  explicit ServerProcess(const Sandbox& sandbox, std::vector<std::string> arguments = {}, std::string output = "");
  // Kills it if it still runs. No log may have a secret in it: a token, a session, a code, or a password of the tests.
  ~ServerProcess();
  ServerProcess(const ServerProcess&) = delete;
  ServerProcess& operator=(const ServerProcess&) = delete;

  bool ready() const { return ready_; }
  pid_t pid() const { return pid_; }
  std::string socket() const { return sandbox_.File("run/vorn/vornd.sock"); }
  int port() const;         // that it listens at; 0 if none
  std::string log() const;  // so far

  // An unrestricted administrator's token, which every server here knows, and the header with it.
  static const std::string& Token();
  static std::string TokenHeader() { return BearerHeader(Token()); }

  Connection Connect() const { return Connection::ToUnix(socket()); }
  Connection ConnectTcp() const { return Connection::ToPort(port()); }

  void Signal(int number) const;

  // Waits for its end. Returns the exit status, or 128 plus the number of the signal that ended it.
  int Wait();

 private:
  void Start(const std::vector<std::string>& arguments);
  bool HasEnded();
  void AwaitReady();

  void StoreToken() const;

  const Sandbox& sandbox_;
  UniqueFd notifications_;
  std::string notify_path_;
  std::string log_path_;
  std::string output_;
  pid_t pid_ = -1;
  int status_ = -1;  // negative while it runs
  bool ready_ = false;
};

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_SERVER_PROCESS_H
