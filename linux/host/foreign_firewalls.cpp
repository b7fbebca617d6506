#include "foreign_firewalls.h"

#include <algorithm>
#include <cctype>

#include "lines.h"

namespace vorn {
namespace {

constexpr std::string_view kOwnTable = "inet vorn";
constexpr std::string_view kMark = "0x01000000";

struct Table {
  std::string name;  // with its family
  std::string rules;
};

bool BeginsWith(std::string_view text, std::string_view prefix) { return text.substr(0, prefix.size()) == prefix; }

bool Has(std::string_view text, std::string_view part) { return text.find(part) != std::string_view::npos; }

std::vector<Table> TablesOf(std::string_view ruleset) {
  std::vector<Table> tables;
  for (const std::string_view line : LinesOf(ruleset)) {
    if (BeginsWith(line, "table ")) tables.push_back({std::string(line.substr(6, line.find(" {") - 6)), ""});
    if (!tables.empty()) tables.back().rules.append(line).append("\n");
  }
  return tables;
}

// Whether a line is a rule without a condition that ends the way of a packet.
bool RejectsAll(std::string_view line) {
  line.remove_prefix(std::min(line.find_first_not_of(" \t"), line.size()));
  if (BeginsWith(line, "counter ")) line.remove_prefix(8);
  return line == "drop" || line == "reject" || BeginsWith(line, "reject with ");
}

bool ClosesInput(const Table& table) {
  bool has_input = false;
  bool drops = false;
  bool rejects = false;
  for (const std::string_view line : LinesOf(table.rules)) {
    const bool is_input = Has(line, "type filter hook input");
    has_input = has_input || is_input;
    drops = drops || (is_input && Has(line, "policy drop"));
    rejects = rejects || RejectsAll(line);
  }
  return drops || (has_input && rejects);
}

bool Mentions(const std::string& rules, int port) {
  const std::string number = std::to_string(port);
  const auto is_digit = [&](std::size_t at) {
    return at < rules.size() && std::isdigit(static_cast<unsigned char>(rules[at])) != 0;
  };
  for (std::size_t at = 0; (at = rules.find(number, at)) != std::string::npos; ++at) {
    if (!is_digit(at + number.size()) && (at == 0 || !is_digit(at - 1))) return true;
  }
  return false;
}

bool IsOpen(const Table& table, const std::vector<ConfiguredPort>& ports) {
  const auto is_mentioned = [&](const ConfiguredPort& port) { return Mentions(table.rules, port.port); };
  return Has(table.rules, kMark) || std::all_of(ports.begin(), ports.end(), is_mentioned);
}

std::string Remedy(const Table& table) {
  if (Has(table.name, "firewalld")) {
    return "firewall-cmd --permanent --add-port=PORT/tcp --add-port=PORT/udp for each, then firewall-cmd --reload";
  }
  if (Has(table.rules, "ufw-")) return "ufw allow PORT for each";
  return "accept there what the NFS service has marked: meta mark & " + std::string(kMark) + " != 0 accept";
}

}  // namespace

std::vector<std::string> FindClosedFirewalls(std::string_view ruleset, const std::vector<ConfiguredPort>& ports) {
  std::string numbers;
  for (const ConfiguredPort& port : ports) numbers += (numbers.empty() ? "" : ", ") + std::to_string(port.port);
  std::vector<std::string> sentences;
  for (const Table& table : TablesOf(ruleset)) {
    if (table.name == kOwnTable || !ClosesInput(table) || IsOpen(table, ports)) continue;
    sentences.push_back("the firewall table " + table.name + " drops what it does not accept, and the ports " +
                        numbers + " of NFS are not open in it; to open them: " + Remedy(table));
  }
  return sentences;
}

}  // namespace vorn
