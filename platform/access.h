// Explains what a client may do in a shared folder, and why. Our own addition to the contract: the API
// "VORN.Core.FileServ.NFS.Access" needs it. The answers have lists of sentences, so these operations are C++ functions
// with values that belong to the caller. Thread-safe.
#ifndef VORN_PLATFORM_ACCESS_H
#define VORN_PLATFORM_ACCESS_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace VORN {

// A client that wants to mount a shared folder.
struct AccessQuestion {
  std::string share;            // the exact name of a shared folder
  std::string client;           // an IPv4 or IPv6 address, or a host name
  std::string flavor = "sys";   // the security flavour: "sys", "krb5", "krb5i" or "krb5p"
  std::string version = "4.2";  // of NFS: "3", "4.0", "4.1" or "4.2"
  int port = 0;                 // the client's port; 0 stands for a reserved one (below 1024), which clients use

  // The user of the client. With the flavour "sys" the name of an account of the box or a user id, with the others a
  // Kerberos principal. Empty: no user is considered.
  std::string user;

  // The groups that a client sends with the flavour "sys", by name or id; the first one is the user's own group. Empty:
  // those that the box knows of the account.
  std::vector<std::string> groups;
};

// An export rule that applies to the client.
struct AccessRule {
  std::string directory;  // of the rule; it differs from that of the share if an outer directory decides
  std::string client;     // as it is written: "10.0.0.0/24"
  std::string kind;       // "host", "network", "pattern", "netgroup" or "everybody": the order in which mountd looks
  std::string file;       // where the rule is written; empty if no file has it
  int line = 0;
  std::string reason;  // "decides"; or why it does not: "kind", "order", "directory"
  std::string text;    // a sentence that says so
};

// The user as whom the server acts.
struct AccessIdentity {
  std::uint32_t user_id = 0;
  std::uint32_t group_id = 0;
  std::vector<std::uint32_t> groups;  // the other groups
  std::string by;                     // "client", "root_squash", "all_squash", "static", "nsswitch" or "nobody"
  std::string text;                   // a sentence that says so
  std::string file;                   // where this is written; empty if it is a default
  int line = 0;
};

// One condition of an access.
struct AccessCheck {
  enum class Result {
    kPassed,
    kFailed,
    kUnknown  // the box cannot tell; the sentence says why
  };
  std::string check;  // "service", "version", "firewall", "name", "rule", "flavor", "port", "way", "read", "write", ...
  Result result = Result::kPassed;
  std::string text;    // a sentence
  std::string remedy;  // what would have to change; empty unless the condition failed
};

// All strings are valid UTF-8.
struct AccessAnswer {
  std::string path;                    // of the shared folder
  std::vector<std::string> addresses;  // of the client; the first one is explained
  std::vector<std::string> names;      // that rpc.mountd(8) has for the client
  bool mountable = false;
  bool read = false;
  bool write = false;
  std::optional<AccessRule> rule;          // the rule that decides
  std::vector<AccessRule> others;          // the other rules that match the client
  std::optional<AccessIdentity> identity;  // none if the question has no user, or no rule decides
  std::vector<AccessCheck> checks;         // in the order in which the server gets to them
};

// A question about all clients of a shared folder.
struct ClientsQuestion {
  AccessQuestion access;  // its client and flavour are not used; an empty version stands for the client's own
  std::vector<std::string> flavors;  // security flavours to explain
  std::size_t offset = 0;            // of the page; one that is behind the last client counts as 0
  std::size_t limit = 0;
};

// The rights of a client in a shared folder with a security flavour.
struct FlavorAccess {
  std::string flavor;
  bool mountable = false;
  bool read = false;
  bool write = false;
};

// A client of a shared folder: one that a rule names, or one that is connected or has mounted something.
struct ClientAccess {
  std::string client;  // as the rule has it: "10.0.0.0/24"; otherwise an address or a host name
  std::string kind;    // of the client in the rule, as AccessRule; empty if no rule names it
  std::string state;   // "connected", "mounted" or the state of a client of NFSv4 (clients.h); empty: none of these

  // The address that was explained: the client's own, or that of a host that stands for a network, a pattern, a
  // netgroup or everybody. Empty if none is known; then there are no flavours.
  std::string address;
  std::string version;                // of NFS, for which it was explained
  std::optional<AccessRule> rule;     // the rule that decides
  std::vector<FlavorAccess> flavors;  // in the order of the question
  std::string text;                   // a sentence about the address; empty for a client with an address of its own
};

enum : int {
  kAccessFailed = -1,   // a failure other than the following ones
  kAccessNoShare = -2,  // there is no shared folder with this name
  kAccessNoUser = -3,   // the box has no such user
  kAccessNoGroup = -4,  // the box has no such group
};

// Explains the access. Asks the name service for the client and for hosts in the rules, and may therefore take as long
// as that service takes; no lock is held. A name service that does not answer is no failure: the answer says so.
// Changes nothing. Returns one of the values above on failure; the reason is then in the error facility (core.h).
int ExplainAccess(const AccessQuestion& question, AccessAnswer* answer);

// Does the same for several shared folders by one reading of the box. The answers are in the order of `shares`; the
// share of the question is not used.
int ExplainAccesses(const AccessQuestion& question, const std::vector<std::string>& shares,
                    std::vector<AccessAnswer>* answers);

// Explains what each client of a shared folder may do: the clients of the export rules of the folder and of those
// around it, in the order of the table of exports, then the clients that are connected or have mounted something, in
// the order of their addresses. A client with several addresses has a row for each. Only the clients of the page are
// explained. `total` receives the number of all. The name service is not asked any more after three questions without
// an answer.
int ExplainClients(const ClientsQuestion& question, std::vector<ClientAccess>* clients, int* total);

}  // namespace VORN

#endif  // VORN_PLATFORM_ACCESS_H
