// idmap_judge_program: reads idmapd.conf files with libnfsidmap. A question on the standard input is a file and
// Kerberos principals, each text ended by a NUL byte, and one more NUL byte. The answer on the standard output has a
// line with the NFSv4 domain, a line for each principal with its local user ID or "none", and then a NUL byte and a
// line with the status: 0, 1 where the library refuses the file, and 128 and more where a signal ended it. Local names
// are looked up on this system.
//
// It is a program of its own, with a child for each question, because the library reads its file once per process, and
// may crash on it.
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <iostream>
#include <string>
#include <vector>

extern "C" {
// This header needs <sys/types.h> and has no extern "C" of its own.
#include <nfsidmap.h>
}

namespace {

void Silent(const char* /*format*/, ...) {}

// The library follows a value that refers to itself without a pause; the limit ends the process. The library takes
// seconds for a large file under a sanitizer.
void LimitCpuTime(const std::string& path) {
  constexpr off_t kSmall = 4096;
  struct stat file {};
  const bool is_small = stat(path.c_str(), &file) == 0 && file.st_size < kSmall;
  const rlim_t seconds = is_small ? 1 : 8;
  const rlimit limit{seconds, seconds};
  setrlimit(RLIMIT_CPU, &limit);
}

void PrintDomain() {
  char domain[512] = "";
  nfs4_get_default_domain(nullptr, domain, sizeof domain);
  std::cout << domain << "\n";
}

void PrintUser(std::string principal) {
  char mechanism[] = "krb5";
  uid_t user = 0;
  gid_t group = 0;
  if (nfs4_gss_princ_to_ids(mechanism, principal.data(), &user, &group) == 0) {
    std::cout << user << "\n";
  } else {
    std::cout << "none\n";
  }
}

[[noreturn]] void Answer(std::vector<std::string> question) {
  if (question.empty()) _exit(1);
  LimitCpuTime(question.front());
  nfs4_set_debug(0, Silent);
  if (nfs4_init_name_mapping(question.front().data()) != 0) _exit(1);
  PrintDomain();
  for (std::size_t at = 1; at < question.size(); ++at) PrintUser(question[at]);
  std::cout.flush();
  _exit(0);  // the library keeps its memory to the end, which a leak check would report
}

bool ReadQuestion(std::vector<std::string>* question) {
  question->clear();
  for (std::string text; std::getline(std::cin, text, '\0');) {
    if (text.empty()) return true;
    question->push_back(std::move(text));
  }
  return false;
}

int StatusOf(pid_t child) {
  int status = 0;
  if (waitpid(child, &status, 0) != child) return 1;
  return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
}

}  // namespace

int main() {
  for (std::vector<std::string> question; ReadQuestion(&question);) {
    const pid_t child = fork();
    if (child == 0) Answer(std::move(question));
    std::cout << '\0' << StatusOf(child) << std::endl;
  }
}
