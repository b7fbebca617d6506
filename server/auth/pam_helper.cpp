// vorn-pam-helper ROOT ADMINISTRATORS READERS: checks one password through PAM, service "vornd", and tells the role of
// the account by its membership in the two groups. vornd starts it with a socket as its standard input, and kills it
// when PAM or the name service hangs.
//
// The accounts, groups and PAM services are those of the system, or for another ROOT than "/" those of the files
// ROOT/etc/passwd, ROOT/etc/group and ROOT/etc/pam.d/vornd.
#include <grp.h>
#include <poll.h>
#include <pwd.h>
#include <security/pam_appl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "password_helper.h"
#include "secret.h"

namespace vorn::server {
namespace {

// vornd kills the helper sooner. This ends a helper whose vornd has died.
constexpr unsigned kAlarmSeconds = 60;

constexpr const char* kService = "vornd";

using Kind = PasswordVerdict::Kind;

struct CloseFile {
  void operator()(std::FILE* file) const { std::fclose(file); }
};
using File = std::unique_ptr<std::FILE, CloseFile>;

struct Account {
  uid_t uid;
  std::set<gid_t> groups;
};

// The accounts and groups of a root.
class Accounts {
 public:
  explicit Accounts(std::string root) : root_(std::move(root)) {}

  std::optional<Account> Find(const std::string& name) const { return OfSystem() ? FromSystem(name) : FromFiles(name); }

  std::optional<gid_t> GroupId(const std::string& group) const {
    std::optional<gid_t> id;
    if (OfSystem()) {
      const struct group* found = getgrnam(group.c_str());
      if (found != nullptr) id = found->gr_gid;
    } else {
      ForEachGroup([&](const struct group& each) {
        if (group == each.gr_name) id = each.gr_gid;
      });
    }
    return id;
  }

 private:
  bool OfSystem() const { return root_ == "/"; }

  static std::optional<Account> FromSystem(const std::string& name) {
    const passwd* entry = getpwnam(name.c_str());
    if (entry == nullptr) return std::nullopt;
    std::vector<gid_t> groups(64);
    auto count = static_cast<int>(groups.size());
    while (getgrouplist(name.c_str(), entry->pw_gid, groups.data(), &count) < 0) {
      groups.resize(std::max(static_cast<std::size_t>(count), 2 * groups.size()));
      count = static_cast<int>(groups.size());
    }
    return Account{entry->pw_uid, std::set<gid_t>(groups.begin(), groups.begin() + count)};
  }

  std::optional<Account> FromFiles(const std::string& name) const {
    const File file(std::fopen((root_ + "/etc/passwd").c_str(), "re"));
    while (const passwd* entry = file ? fgetpwent(file.get()) : nullptr) {
      if (name != entry->pw_name) continue;
      Account account{entry->pw_uid, {entry->pw_gid}};
      ForEachGroup([&](const struct group& group) {
        for (char** member = group.gr_mem; *member != nullptr; ++member) {
          if (name == *member) account.groups.insert(group.gr_gid);
        }
      });
      return account;
    }
    return std::nullopt;
  }

  template <typename Visit>
  void ForEachGroup(const Visit& visit) const {
    const File file(std::fopen((root_ + "/etc/group").c_str(), "re"));
    while (const struct group* group = file ? fgetgrent(file.get()) : nullptr) visit(*group);
  }

  const std::string root_;
};

// Answers each question without an echo with the password. PAM frees the answers (pam_conv(3)).
int Converse(int count, const pam_message** messages, pam_response** responses, void* password) {
  auto* answers = static_cast<pam_response*>(std::calloc(static_cast<std::size_t>(count), sizeof(pam_response)));
  if (answers == nullptr) return PAM_BUF_ERR;
  for (int i = 0; i < count; ++i) {
    if (messages[i]->msg_style == PAM_PROMPT_ECHO_OFF) answers[i].resp = strdup(static_cast<const char*>(password));
  }
  *responses = answers;
  return PAM_SUCCESS;
}

// Replaces PAM's own random delay: vornd delays the answer to all wrong passwords alike.
void NoDelay(int /*status*/, unsigned /*microseconds*/, void* /*data*/) {}

// A transaction with PAM (pam_start(3)).
class Transaction {
 public:
  Transaction(const std::string& root, PasswordRequest* request) : conversation_{Converse, request->password.data()} {
    const std::string folder = root + "/etc/pam.d";
    const char* account = request->account.c_str();
    status_ = root == "/" ? pam_start(kService, account, &conversation_, &handle_)
                          : pam_start_confdir(kService, account, &conversation_, folder.c_str(), &handle_);
    if (status_ != PAM_SUCCESS) return;
    pam_set_item(handle_, PAM_RHOST, request->address.c_str());
    pam_set_item(handle_, PAM_FAIL_DELAY, reinterpret_cast<const void*>(NoDelay));
  }
  ~Transaction() {
    if (handle_ != nullptr) pam_end(handle_, status_);
  }
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;

  int Check() {
    if (status_ == PAM_SUCCESS) status_ = pam_authenticate(handle_, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
    if (status_ == PAM_SUCCESS) status_ = pam_acct_mgmt(handle_, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
    return status_;
  }

  std::string account() const {
    const void* name = nullptr;
    return pam_get_item(handle_, PAM_USER, &name) == PAM_SUCCESS && name != nullptr ? static_cast<const char*>(name)
                                                                                    : "";
  }

 private:
  pam_conv conversation_;
  pam_handle_t* handle_ = nullptr;
  int status_ = PAM_SYSTEM_ERR;
};

Kind KindOf(int status) {
  switch (status) {
    case PAM_SUCCESS:
      return Kind::kGranted;
    case PAM_AUTHINFO_UNAVAIL:
    case PAM_SYSTEM_ERR:
    case PAM_BUF_ERR:
    case PAM_OPEN_ERR:
    case PAM_SYMBOL_ERR:
    case PAM_SERVICE_ERR:
    case PAM_MODULE_UNKNOWN:
    case PAM_ABORT:
      return Kind::kUnavailable;
    default:
      return Kind::kRefused;
  }
}

std::optional<Role> RoleOf(const Accounts& accounts, const std::string& name, const char* administrators,
                           const char* readers) {
  const std::optional<Account> account = accounts.Find(name);
  if (!account) return std::nullopt;
  const auto belongs_to = [&](const char* group) {
    const std::optional<gid_t> id = accounts.GroupId(group);
    return id && account->groups.count(*id) != 0;
  };
  if (account->uid == 0 || belongs_to(administrators)) return Role::kAdministrator;
  if (belongs_to(readers)) return Role::kReader;
  return std::nullopt;
}

PasswordVerdict Judge(char** arguments, PasswordRequest request) {
  Transaction transaction(arguments[1], &request);
  const Kind kind = KindOf(transaction.Check());
  Wipe(&request.password);
  if (kind != Kind::kGranted) return {kind};
  const std::string account = transaction.account();
  const std::optional<Role> role = RoleOf(Accounts(arguments[1]), account, arguments[2], arguments[3]);
  if (!role) return {Kind::kNoRole};
  return {Kind::kGranted, *role, account};
}

// Whether the server's end of the socket has been closed, also if there is still a request to read.
bool ServerHasEnded() {
  pollfd socket{STDIN_FILENO, 0, 0};
  return poll(&socket, 1, 0) == 1 && (socket.revents & POLLHUP) != 0;
}

int Run(char** arguments) {
  std::string message(kMaxMessage, '\0');
  const ssize_t size = recv(STDIN_FILENO, message.data(), message.size(), 0);
  if (size <= 0) return EXIT_FAILURE;
  const std::string_view received = message;
  std::optional<PasswordRequest> request = ParseRequest(received.substr(0, static_cast<std::size_t>(size)));
  Wipe(&message);
  if (!request) return EXIT_FAILURE;
  const std::string verdict = FormatVerdict(Judge(arguments, *std::move(request)));
  return send(STDIN_FILENO, verdict.data(), verdict.size(), MSG_NOSIGNAL) < 0 ? EXIT_FAILURE : EXIT_SUCCESS;
}

}  // namespace
}  // namespace vorn::server

// A core file would have the password in it, and so would the memory that a debugger of the same user reads.
int main(int argc, char** argv) {
  if (argc != 4) {
    std::fputs("vorn-pam-helper is started by vornd alone.\n", stderr);
    return 2;
  }
  prctl(PR_SET_DUMPABLE, 0, 0, 0, 0);
  // The server's thread that starts helpers ends them before it ends itself. A killed server cannot do that.
  prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);
  if (vorn::server::ServerHasEnded()) return EXIT_FAILURE;
  alarm(vorn::server::kAlarmSeconds);
  return vorn::server::Run(argv);
}
