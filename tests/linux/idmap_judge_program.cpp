// idmap_judge_program FILE [PRINCIPAL...]: reads an idmapd.conf with libnfsidmap. Prints the NFSv4 domain, and then for
// each Kerberos principal its local user ID or "none". Local names are looked up on this system. The exit status is 1
// where the library refuses the file.
//
// It is a program of its own because the library reads its file once per process, and may crash on it.
#include <sys/resource.h>
#include <sys/types.h>
#include <unistd.h>

#include <iostream>

extern "C" {
// This header needs <sys/types.h> and has no extern "C" of its own.
#include <nfsidmap.h>
}

namespace {

void Silent(const char* /*format*/, ...) {}

// The library follows a value that refers to itself without a pause; the limit ends the process. It is generous,
// because the library takes seconds for a large file under a sanitizer.
void LimitCpuTime() {
  constexpr rlimit kSeconds{8, 8};
  setrlimit(RLIMIT_CPU, &kSeconds);
}

void PrintDomain() {
  char domain[512] = "";
  nfs4_get_default_domain(nullptr, domain, sizeof domain);
  std::cout << domain << "\n";
}

void PrintUser(char* principal) {
  char mechanism[] = "krb5";
  uid_t user = 0;
  gid_t group = 0;
  if (nfs4_gss_princ_to_ids(mechanism, principal, &user, &group) == 0) {
    std::cout << user << "\n";
  } else {
    std::cout << "none\n";
  }
}

}  // namespace

int main(int count, char** arguments) {
  LimitCpuTime();
  nfs4_set_debug(0, Silent);
  if (count < 2 || nfs4_init_name_mapping(arguments[1]) != 0) return 1;
  PrintDomain();
  for (int index = 2; index < count; ++index) PrintUser(arguments[index]);
  std::cout.flush();
  _exit(0);  // the library keeps its memory to the end, which a leak check would report
}
