#include "host_names.h"

#include <arpa/inet.h>
#include <netdb.h>
#include <netinet/in.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <map>
#include <memory>
#include <utility>

namespace vorn {
namespace {

struct Address {
  int family = AF_UNSPEC;
  socklen_t size = 0;
  std::array<unsigned char, sizeof(in6_addr)> bytes{};
};

constexpr std::chrono::seconds kLongestWait{10};
constexpr std::array<unsigned char, 12> kMappedPrefix = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff};

std::optional<Address> ReadAddress(const std::string& text) {
  Address address;
  if (inet_pton(AF_INET, text.c_str(), address.bytes.data()) == 1) {
    address.family = AF_INET;
    address.size = sizeof(in_addr);
    return address;
  }
  if (inet_pton(AF_INET6, text.c_str(), address.bytes.data()) != 1) return std::nullopt;
  address.family = AF_INET6;
  address.size = sizeof(in6_addr);
  if (std::memcmp(address.bytes.data(), kMappedPrefix.data(), kMappedPrefix.size()) == 0) {
    std::memmove(address.bytes.data(), address.bytes.data() + kMappedPrefix.size(), sizeof(in_addr));
    address.family = AF_INET;
    address.size = sizeof(in_addr);
  }
  return address;
}

// Asks gethostbyname(3), as rpc.mountd(8) does, for the aliases of a name. They may belong to another address of it.
std::vector<std::string> AliasesOf(const std::string& name) {
  std::vector<char> buffer(1024);
  hostent entry{};
  hostent* found = nullptr;
  int error = 0;
  while (gethostbyname_r(name.c_str(), &entry, buffer.data(), buffer.size(), &found, &error) == ERANGE) {
    buffer.resize(buffer.size() * 2);
  }
  std::vector<std::string> aliases;
  for (char** alias = found == nullptr ? nullptr : found->h_aliases; alias != nullptr && *alias != nullptr; ++alias) {
    aliases.emplace_back(*alias);
  }
  return aliases;
}

std::optional<std::vector<std::string>> NamesOf(const std::string& text) {
  const std::optional<Address> address = ReadAddress(text);
  if (!address) return std::vector<std::string>();
  std::vector<char> buffer(1024);
  hostent entry{};
  hostent* found = nullptr;
  int error = 0;
  while (gethostbyaddr_r(address->bytes.data(), address->size, address->family, &entry, buffer.data(), buffer.size(),
                         &found, &error) == ERANGE) {
    buffer.resize(buffer.size() * 2);
  }
  if (found == nullptr) {
    const bool is_silent = error == TRY_AGAIN || error == NO_RECOVERY;
    return is_silent ? std::nullopt : std::optional(std::vector<std::string>());
  }
  std::vector<std::string> names = AliasesOf(found->h_name);
  names.insert(names.begin(), found->h_name);
  return names;
}

bool IsMember(const std::string& netgroup, const std::string& host) {
  return innetgr(netgroup.c_str(), host.c_str(), nullptr, nullptr) != 0;
}

using Answer = std::optional<std::vector<std::string>>;

// The answers of a name service.
class Memory {
 public:
  Memory(NameService service, NameService::Clock clock) : service_(std::move(service)), clock_(std::move(clock)) {}

  Answer Resolve(const std::string& name) { return Ask(service_.resolve, name, &addresses_); }
  Answer NamesOf(const std::string& address) { return Ask(service_.names_of, address, &names_); }

  bool IsMember(const std::string& netgroup, const std::string& host) {
    const auto [known, is_new] = members_.try_emplace({netgroup, host}, false);
    if (is_new) known->second = service_.is_member(netgroup, host);
    return known->second;
  }

 private:
  template <typename Question>
  Answer Ask(const Question& ask, const std::string& about, std::map<std::string, Answer>* answers) {
    const auto known = answers->find(about);
    if (known != answers->end()) return known->second;
    if (waited_ >= kLongestWait) return std::nullopt;
    const auto begin = clock_();
    const Answer& answer = answers->emplace(about, ask(about)).first->second;
    if (!answer) waited_ += clock_() - begin;
    return answer;
  }

  NameService service_;
  NameService::Clock clock_;
  std::map<std::string, Answer> addresses_;
  std::map<std::string, Answer> names_;
  std::map<std::pair<std::string, std::string>, bool> members_;  // by netgroup and host
  std::chrono::steady_clock::duration waited_{0};                // for answers that did not come
};

}  // namespace

NameService NameService::OfSystem() { return {ResolveHost, NamesOf, IsMember}; }

NameService NameService::Remembering(const NameService& service, Clock clock) {
  const auto memory = std::make_shared<Memory>(service, std::move(clock));
  return {[memory](const std::string& name) { return memory->Resolve(name); },
          [memory](const std::string& address) { return memory->NamesOf(address); },
          [memory](const std::string& netgroup, const std::string& host) { return memory->IsMember(netgroup, host); }};
}

std::optional<std::string> HostAddress(const std::string& text) {
  const std::optional<Address> address = ReadAddress(text);
  if (!address) return std::nullopt;
  std::array<char, INET6_ADDRSTRLEN> usual{};
  return std::string(inet_ntop(address->family, address->bytes.data(), usual.data(), usual.size()));
}

}  // namespace vorn
