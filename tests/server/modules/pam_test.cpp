// A PAM module with accounts for each case. The right password of an account is "Passphrase-of-" and its name.
#include <security/pam_modules.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

namespace {

bool IsKnown(const std::string& account) {
  for (const char* known : {"alice", "bob", "carol", "expired", "hang", "crash"}) {
    if (account == known) return true;
  }
  return false;
}

std::string AskPassword(pam_handle_t* handle) {
  const void* item = nullptr;
  if (pam_get_item(handle, PAM_CONV, &item) != PAM_SUCCESS || item == nullptr) return "";
  const auto* conversation = static_cast<const pam_conv*>(item);
  const pam_message question{PAM_PROMPT_ECHO_OFF, "Password: "};
  const pam_message* questions = &question;
  pam_response* answer = nullptr;
  if (conversation->conv(1, &questions, &answer, conversation->appdata_ptr) != PAM_SUCCESS) return "";
  const std::string password = answer->resp == nullptr ? "" : answer->resp;
  std::free(answer->resp);
  std::free(answer);
  return password;
}

}  // namespace

// An unknown account is noticed at once, a wrong password only later: a client must not see the difference.
extern "C" __attribute__((visibility("default"))) int pam_sm_authenticate(pam_handle_t* handle, int /*flags*/,
                                                                          int /*argc*/, const char** /*argv*/) {
  const char* account = nullptr;
  if (pam_get_user(handle, &account, nullptr) != PAM_SUCCESS) return PAM_SYSTEM_ERR;
  const std::string name = account;
  if (name == "hang") pause();
  if (name == "crash") std::abort();
  if (!IsKnown(name)) return PAM_USER_UNKNOWN;
  if (AskPassword(handle) == "Passphrase-of-" + name) return PAM_SUCCESS;
  usleep(300000);
  return PAM_AUTH_ERR;
}

extern "C" __attribute__((visibility("default"))) int pam_sm_setcred(pam_handle_t* /*handle*/, int /*flags*/,
                                                                     int /*argc*/, const char** /*argv*/) {
  return PAM_SUCCESS;
}

extern "C" __attribute__((visibility("default"))) int pam_sm_acct_mgmt(pam_handle_t* handle, int /*flags*/,
                                                                       int /*argc*/, const char** /*argv*/) {
  const char* account = nullptr;
  if (pam_get_user(handle, &account, nullptr) != PAM_SUCCESS) return PAM_SYSTEM_ERR;
  return std::string(account) == "expired" ? PAM_ACCT_EXPIRED : PAM_SUCCESS;
}
