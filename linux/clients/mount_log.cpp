#include "mount_log.h"

#include <algorithm>
#include <chrono>

#include "host_names.h"
#include "journal.h"

namespace vorn {
namespace {

constexpr char kIdentifier[] = "rpc.mountd";
constexpr std::chrono::hours kAge{24};

// The end of a message, and the reason that it stands for.
struct Reason {
  std::string_view end;
  const char* name;
};

constexpr Reason kReasons[] = {{"unmatched host", "no_rule"},
                               {"no export entry", "no_rule"},
                               {"not exported", "not_exported"},
                               {"illegal port ", "port"}};

bool Skip(std::string_view* text, std::string_view begin) {
  if (text->substr(0, begin.size()) != begin) return false;
  text->remove_prefix(begin.size());
  return true;
}

// Removes the words before the first blank and returns them.
std::string_view TakeWord(std::string_view* text) {
  const std::string_view word = text->substr(0, text->find(' '));
  text->remove_prefix(std::min(text->size(), word.size() + 1));
  return word;
}

// "/srv/data (/srv/data)": the path that was asked for, and that of the export. The last " (" may belong to the second
// one; a path with such characters is then shown too long.
std::string PathOf(std::string_view text) { return std::string(text.substr(0, text.rfind(" ("))); }

// "10.0.0.1 for /srv/data (/srv/data): not exported".
std::optional<MountRequest> ParseRefused(std::string_view text) {
  const std::optional<std::string> address = HostAddress(std::string(TakeWord(&text)));
  if (!address || !Skip(&text, "for ")) return std::nullopt;
  const std::size_t colon = std::min(text.rfind(": "), text.size());
  const std::string_view end = text.substr(std::min(colon + 2, text.size()));
  for (const Reason& reason : kReasons) {
    if (end.substr(0, reason.end.size()) != reason.end) continue;
    return MountRequest{*address, PathOf(text.substr(0, colon)), reason.name};
  }
  return std::nullopt;
}

// "10.0.0.1:871 for /srv/data (/srv/data)".
std::optional<MountRequest> ParseAdmitted(std::string_view text) {
  const std::string_view host = TakeWord(&text);
  const std::optional<std::string> address = HostAddress(std::string(host.substr(0, host.rfind(':'))));
  if (!address || !Skip(&text, "for ")) return std::nullopt;
  return MountRequest{*address, PathOf(text), ""};
}

// "10.0.0.1: "/srv/data"".
std::optional<MountRequest> ParseBadPath(std::string_view text) {
  std::string_view host = TakeWord(&text);
  if (!host.empty() && host.back() == ':') host.remove_suffix(1);
  const std::optional<std::string> address = HostAddress(std::string(host));
  if (!address || text.size() < 2 || text.front() != '"') return std::nullopt;
  return MountRequest{*address, std::string(text.substr(1, text.size() - 2)), "path"};
}

}  // namespace

std::optional<MountRequest> ParseMountMessage(std::string_view message) {
  if (Skip(&message, "refused mount request from ")) return ParseRefused(message);
  if (Skip(&message, "authenticated mount request from ")) return ParseAdmitted(message);
  if (Skip(&message, "bad path in mount request from ")) return ParseBadPath(message);
  return std::nullopt;
}

void MountLog::Add(const MountRequest& request, std::int64_t time) {
  if (request.reason.empty()) {
    std::int64_t& last = admitted[request.address];
    last = std::max(last, time);
    return;
  }
  auto& of_client = refused[request.address];
  const std::pair<std::string, std::string> key(request.path, request.reason);
  if (of_client.size() == kMostRefusals && of_client.count(key) == 0) return;
  Refused& refusals = of_client[key];
  ++refusals.count;
  refusals.last = std::max(refusals.last, time);
}

MountLog ReadMountLog() {
  MountLog log;
  VisitJournal(kIdentifier, kAge, [&](std::string_view message, std::int64_t time) {
    if (const std::optional<MountRequest> request = ParseMountMessage(message)) log.Add(*request, time);
  });
  return log;
}

}  // namespace vorn
