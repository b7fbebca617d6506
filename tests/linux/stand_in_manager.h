// A fake of systemd's manager on a private bus. It records the calls of the service engine and ends
// jobs as the test requests.
#ifndef VORN_TESTS_LINUX_STAND_IN_MANAGER_H
#define VORN_TESTS_LINUX_STAND_IN_MANAGER_H

#include <atomic>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "processes.h"
#include "temporary_root.h"

struct sd_bus;
struct sd_bus_message;

class StandInManager {
 public:
  StandInManager();  // with a dbus-daemon of its own
  ~StandInManager();
  StandInManager(const StandInManager&) = delete;
  StandInManager& operator=(const StandInManager&) = delete;

  const std::string& address() const { return address_; }

  // Returns the calls since the last time, in order: "StartUnit nfs-server.service replace".
  std::vector<std::string> TakeCalls();

  // Makes "MethodName unit" answer with an error: org.freedesktop.systemd1.`error`.
  void Refuse(const std::string& call, const std::string& error = "Refused");
  // Makes the job of "MethodName unit" end with the result `outcome`; with "never" it does not end.
  void End(const std::string& call, const std::string& outcome);
  void SetUnitFileState(const std::string& state);

  // For the bus' callbacks.
  int Take(sd_bus_message* message, const char* types);

 private:
  bool Connect();
  void Serve();
  int AnswerJob(sd_bus_message* message, const std::string& call);

  TemporaryRoot folder_;
  std::string address_;
  std::unique_ptr<ChildProcess> daemon_;
  std::mutex mutex_;
  std::vector<std::string> calls_;
  std::map<std::string, std::string> refused_;  // call to error
  std::map<std::string, std::string> outcomes_;
  std::string unit_file_state_ = "disabled";
  int jobs_ = 0;
  sd_bus* bus_ = nullptr;
  std::atomic<bool> stop_{false};
  std::thread thread_;
};

#endif  // VORN_TESTS_LINUX_STAND_IN_MANAGER_H
