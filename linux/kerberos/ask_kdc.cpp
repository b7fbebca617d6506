#include "ask_kdc.h"

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <string>
#include <type_traits>
#include <utility>

#include "keytab_file.h"
#include "krb5_library.h"
#include "memory_file.h"

namespace vorn {
namespace {

using State = KdcAnswer::State;

constexpr std::size_t kMostServices = 8;
constexpr std::size_t kMostOthers = 3;  // other principals that are tried for one service
constexpr krb5_deltat kLifetime = 60;   // of the ticket, in seconds; nobody uses it

// Releases an object of the library, which takes the context, too.
template <typename T, auto kRelease>
class Held {
 public:
  explicit Held(krb5_context context) : context_(context) {}
  ~Held() {
    if (object_ != nullptr) kRelease(context_, object_);
  }
  Held(const Held&) = delete;
  Held& operator=(const Held&) = delete;

  T get() const { return object_; }
  T* slot() { return &object_; }

 private:
  krb5_context context_;
  T object_ = nullptr;
};

using Principal = Held<krb5_principal, krb5_free_principal>;
using Options = Held<krb5_get_init_creds_opt*, krb5_get_init_creds_opt_free>;
using Ticket = Held<krb5_ticket*, krb5_free_ticket>;
using Keytab = Held<krb5_keytab, krb5_kt_close>;

class Credentials {
 public:
  explicit Credentials(krb5_context context) : context_(context) {}
  ~Credentials() { krb5_free_cred_contents(context_, &content_); }
  Credentials(const Credentials&) = delete;
  Credentials& operator=(const Credentials&) = delete;

  krb5_creds* get() { return &content_; }

 private:
  krb5_context context_;
  krb5_creds content_{};
};

// The KDC, or the library after an answer, found that the client's key differs from the KDC's.
bool IsWrongKey(krb5_error_code error) {
  return error == KRB5KDC_ERR_PREAUTH_FAILED || error == KRB5KRB_AP_ERR_BAD_INTEGRITY || error == KRB5_PREAUTH_FAILED ||
         error == KRB5_KT_NOTFOUND || error == KRB5_KT_KVNONOTFOUND;
}

class Asker {
 public:
  Asker(krb5_context context, krb5_keytab keytab) : context_(context), keytab_(keytab) {}

  // Asks about `service` as the first of `clients` that the KDC knows.
  KdcAnswer Ask(const std::string& service, const std::vector<std::string>& clients) {
    for (const std::string& client : clients) {
      Credentials credentials(context_);
      const krb5_error_code error = GetTicket(service, client, credentials.get());
      if (error == KRB5KDC_ERR_C_PRINCIPAL_UNKNOWN) continue;
      if (error == 0) return Judge(service, *credentials.get());
      if (error == KRB5KDC_ERR_S_PRINCIPAL_UNKNOWN) return {State::kUnknown, service, "", {}};
      if (client == service && IsWrongKey(error)) return {State::kOutdated, service, "", {}};
      return {State::kNone, service, ErrorText(context_, error), {}};
    }
    return {State::kUnknown, service, "", {}};
  }

 private:
  krb5_error_code GetTicket(const std::string& service, const std::string& client, krb5_creds* credentials) {
    Principal principal(context_);
    if (const auto error = krb5_parse_name(context_, client.c_str(), principal.slot()); error != 0) return error;
    Options options(context_);
    if (const auto error = krb5_get_init_creds_opt_alloc(context_, options.slot()); error != 0) return error;
    krb5_get_init_creds_opt_set_tkt_life(options.get(), kLifetime);
    krb5_get_init_creds_opt_set_forwardable(options.get(), 0);
    krb5_get_init_creds_opt_set_proxiable(options.get(), 0);
    return krb5_get_init_creds_keytab(context_, credentials, principal.get(), keytab_, 0, service.c_str(),
                                      options.get());
  }

  // Reads the ticket as rpc.svcgssd(8) reads that of a client.
  KdcAnswer Judge(const std::string& service, const krb5_creds& credentials) {
    Ticket ticket(context_);
    if (const auto error = krb5_decode_ticket(&credentials.ticket, ticket.slot()); error != 0) {
      return {State::kNone, service, ErrorText(context_, error), {}};
    }
    const bool is_read = krb5_server_decrypt_ticket_keytab(context_, keytab_, ticket.get()) == 0;
    const krb5_enc_data& sealed = ticket.get()->enc_part;
    const std::string key = "version " + std::to_string(sealed.kvno) + ", " + EncTypeName(sealed.enctype);
    return {is_read ? State::kCurrent : State::kOutdated, service, is_read ? "" : key, ClockLead()};
  }

  // Known after an answer, unless krb5.conf(5) switches "kdc_timesync" off.
  std::optional<long> ClockLead() {
    krb5_timestamp seconds = 0;
    krb5_int32 microseconds = 0;
    if (krb5_get_time_offsets(context_, &seconds, &microseconds) != 0) return std::nullopt;
    return seconds;
  }

  krb5_context context_;
  krb5_keytab keytab_;
};

bool IsOfNFS(const std::string& principal) { return principal.compare(0, 4, "nfs/") == 0; }

// The service itself, then the principals that can sign in where services cannot.
std::vector<std::string> ClientsFor(const std::string& service, const std::vector<std::string>& principals) {
  std::vector<std::string> clients = {service};
  for (const std::string& principal : principals) {
    if (!IsOfNFS(principal) && clients.size() <= kMostOthers) clients.push_back(principal);
  }
  return clients;
}

// Without repetitions, in the order of the keytab.
std::vector<std::string> PrincipalsOf(const std::vector<KeytabKey>& keys) {
  std::vector<std::string> principals;
  for (const KeytabKey& key : keys) {
    if (std::find(principals.begin(), principals.end(), key.principal) == principals.end()) {
      principals.push_back(key.principal);
    }
  }
  return principals;
}

}  // namespace

Result<std::vector<KdcAnswer>> AskKdc(std::string_view content) {
  const Result<std::vector<KeytabKey>> keys = ReadKeytab(content);
  if (!keys.ok()) return keys.status();
  const Result<FileDescriptor> file = MakeMemoryFile("keytab", content);
  if (!file.ok()) return file.status();
  krb5_context opened = nullptr;
  if (const auto error = krb5_init_context(&opened); error != 0) {
    return Status::Failure(kUnsupported, "krb5.conf(5): " + ErrorText(nullptr, error));
  }
  const Krb5Context context(opened);
  Keytab keytab(context.get());
  const std::string name = "FILE:" + PathOf(*file);
  if (const auto error = krb5_kt_resolve(context.get(), name.c_str(), keytab.slot()); error != 0) {
    return Status::Failure(kUnsupported, ErrorText(context.get(), error));
  }
  const std::vector<std::string> principals = PrincipalsOf(*keys);
  Asker asker(context.get(), keytab.get());
  std::vector<KdcAnswer> answers;
  for (const std::string& principal : principals) {
    if (!IsOfNFS(principal) || answers.size() >= kMostServices) continue;
    answers.push_back(asker.Ask(principal, ClientsFor(principal, principals)));
  }
  return answers;
}

}  // namespace vorn
