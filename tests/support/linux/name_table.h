// A name service for tests.
#ifndef VORN_TESTS_SUPPORT_LINUX_NAME_TABLE_H
#define VORN_TESTS_SUPPORT_LINUX_NAME_TABLE_H

#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "host_names.h"

namespace vorn {

// A name service with the hosts of a table.
struct NameTable {
  std::multimap<std::string, std::string> hosts;  // name to address; the first name of an address is canonical
  std::set<std::pair<std::string, std::string>> members;
  bool is_away = false;
  int questions = 0;                                 // that were asked
  std::multimap<std::string, std::string> aliens{};  // names of addresses that the names do not lead back to

  NameService service() {
    NameService service;
    service.resolve = [this](const std::string& name) -> std::optional<std::vector<std::string>> {
      ++questions;
      if (is_away) return std::nullopt;
      std::vector<std::string> addresses;
      for (auto [at, end] = hosts.equal_range(name); at != end; ++at) addresses.push_back(at->second);
      return addresses;
    };
    service.names_of = [this](const std::string& address) -> std::optional<std::vector<std::string>> {
      ++questions;
      if (is_away) return std::nullopt;
      std::vector<std::string> names;
      for (const auto* table : {&hosts, &aliens}) {
        for (const auto& [name, of] : *table) {
          if (of == address) names.push_back(name);
        }
      }
      return names;
    };
    service.is_member = [this](const std::string& netgroup, const std::string& host) {
      ++questions;
      return members.count({netgroup, host}) != 0;
    };
    return service;
  }
};

}  // namespace vorn

#endif  // VORN_TESTS_SUPPORT_LINUX_NAME_TABLE_H
