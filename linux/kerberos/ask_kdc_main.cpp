// vorn-ask-kdc: asks the KDC about the keytab of the NFS service, and prints the answers (kdc_answer.h). A process of
// its own, because the library waits for the network.
#include <cstdio>
#include <cstdlib>
#include <exception>

#include "ask_kdc.h"
#include "files.h"
#include "keytab.h"
#include "root.h"

namespace {

constexpr char kSettings[] = "/etc/krb5.conf";

vorn::Result<std::vector<vorn::KdcAnswer>> Ask(const vorn::Root& root) {
  const vorn::Result<std::string> settings = root.Locate(kSettings);
  if (!settings.ok()) return settings.status();
  if (!root.is_box()) setenv("KRB5_CONFIG", settings->c_str(), 1);  // no other thread runs
  const vorn::Result<std::string> location = root.Locate(vorn::kKeytabFile);
  if (!location.ok()) return location.status();
  const vorn::Result<vorn::FileText> keytab = vorn::ReadFile(*location);
  if (!keytab.ok()) return keytab.status();
  return vorn::AskKdc(keytab->text);
}

int Fail(const char* reason) {
  std::fprintf(stderr, "%s\n", reason);
  return 1;
}

}  // namespace

int main() {
  try {
    const auto answers = Ask(vorn::Root::Current());
    if (!answers.ok()) return Fail(answers.status().reason().c_str());
    const bool is_written = std::fputs(vorn::FormatAnswers(*answers).c_str(), stdout) >= 0;
    return is_written && std::fflush(stdout) == 0 ? 0 : 1;
  } catch (const std::exception& error) {
    return Fail(error.what());
  }
}
