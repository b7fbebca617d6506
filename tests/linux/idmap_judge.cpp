#include "idmap_judge.h"

#include <dlfcn.h>
#include <netdb.h>
#include <pwd.h>
#include <sys/resource.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <stdexcept>

#include "processes.h"
#include "temporary_root.h"

extern "C" {
#include <sys/types.h>
// This header needs the types above and has no extern "C" of its own.
#include <nfsidmap.h>
}

namespace {

constexpr int kSignalled = 128;  // ProgramResult::status

void Silent(const char* /*format*/, ...) {}

std::size_t CountThreads() {
  const std::filesystem::directory_iterator threads("/proc/self/task");
  return static_cast<std::size_t>(std::distance(begin(threads), end(threads)));
}

// fork(2) copies the calling thread only: a lock that another thread owns, such as that of a name service, stays
// taken in the child. The platform asks for the host's domain in a thread, which ends with the answer. A sanitizer
// may have a thread that never ends, so the number of threads is only waited for once.
void WaitForOtherThreads() {
  static const std::size_t usual = [] {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    while (CountThreads() > 1 && std::chrono::steady_clock::now() < deadline) usleep(1000);
    return CountThreads();
  }();
  Eventually([] { return CountThreads() <= usual; });
}

// Loads the modules of the name service, and lets the dynamic linker cache the folders without plug-ins, so that each
// child inherits both.
void PrepareForChildren() {
  [[maybe_unused]] static const bool is_prepared = [] {
    getpwnam("root");
    gethostbyname("localhost");
    return dlopen("static.so", RTLD_NOW) == nullptr && dlopen("nsswitch.so", RTLD_NOW) == nullptr;
  }();
}

// The library follows a value that refers to itself without a pause; the limit ends its process.
void LimitCpuTime() {
  constexpr rlimit kSeconds{1, 1};
  setrlimit(RLIMIT_CPU, &kSeconds);
}

// Calls the library in a child process, because it reads its file only once per process.
std::vector<std::string> Ask(const std::string& path, const std::function<void(std::ostream&)>& questions) {
  const TemporaryRoot scratch;
  PrepareForChildren();
  WaitForOtherThreads();
  ChildProcess child([&] {
    LimitCpuTime();
    std::string file = path;
    nfs4_set_debug(0, Silent);
    if (nfs4_init_name_mapping(file.data()) != 0) return 1;
    std::ofstream answers(scratch.At("/answers"));
    questions(answers);
    return answers.flush() ? 0 : 2;
  });
  const int status = child.Wait();
  if (status >= kSignalled) throw LibraryCrash("the ID-mapping library crashes on " + path);
  if (status != 0) throw std::runtime_error("the ID-mapping library refuses " + path);
  std::ifstream answers(scratch.At("/answers"));
  std::vector<std::string> lines;
  for (std::string line; std::getline(answers, line);) lines.push_back(line);
  return lines;
}

}  // namespace

std::vector<std::optional<unsigned>> MapByLibrary(const std::string& path, const std::vector<std::string>& principals) {
  const std::vector<std::string> lines = Ask(path, [&](std::ostream& answers) {
    for (std::string principal : principals) {
      char mechanism[] = "krb5";
      uid_t user = 0;
      gid_t group = 0;
      const bool mapped = nfs4_gss_princ_to_ids(mechanism, principal.data(), &user, &group) == 0;
      answers << (mapped ? std::to_string(user) : "none") << "\n";
    }
  });
  std::vector<std::optional<unsigned>> users;
  users.reserve(lines.size());
  for (const std::string& line : lines) {
    users.push_back(line == "none" ? std::nullopt : std::optional<unsigned>(std::stoul(line)));
  }
  return users;
}

std::string DomainByLibrary(const std::string& path) {
  const std::vector<std::string> lines = Ask(path, [](std::ostream& answers) {
    char domain[512] = "";
    nfs4_get_default_domain(nullptr, domain, sizeof domain);
    answers << domain << "\n";
  });
  return lines.empty() ? "" : lines.front();
}
