// A fake rpcbind(8) that answers which services are registered. It needs a private /run.
#ifndef VORN_TESTS_LINUX_STAND_IN_RPCBIND_H
#define VORN_TESTS_LINUX_STAND_IN_RPCBIND_H

#include <memory>
#include <string>
#include <vector>

#include "processes.h"

struct Registration {
  unsigned long program;
  std::string netid;    // "tcp", "udp6"
  std::string address;  // RFC 5665: "0.0.0.0.15.160" is port 4000
};

class StandInRpcbind {
 public:
  explicit StandInRpcbind(const std::vector<Registration>& registrations);
  ~StandInRpcbind();
  StandInRpcbind(const StandInRpcbind&) = delete;
  StandInRpcbind& operator=(const StandInRpcbind&) = delete;

 private:
  std::unique_ptr<ChildProcess> server_;
};

#endif  // VORN_TESTS_LINUX_STAND_IN_RPCBIND_H
