#include "idmap_judge.h"

#include <sstream>
#include <utility>

#include "processes.h"

namespace {

constexpr int kSignalled = 128;  // ProgramResult::status

struct Answer {
  std::string domain;
  std::vector<std::string> users;
};

Answer Ask(const std::string& path, const std::vector<std::string>& principals) {
  std::vector<std::string> arguments{VORN_IDMAP_JUDGE, path};
  arguments.insert(arguments.end(), principals.begin(), principals.end());
  const ProgramResult result = RunProgram(arguments);
  if (result.status >= kSignalled) throw LibraryCrash("the ID-mapping library crashes on " + path);
  if (result.status != 0) throw std::runtime_error("the ID-mapping library refuses " + path);
  std::istringstream lines(result.output);
  Answer answer;
  std::getline(lines, answer.domain);
  for (std::string line; std::getline(lines, line);) answer.users.push_back(std::move(line));
  return answer;
}

}  // namespace

std::vector<std::optional<unsigned>> MapByLibrary(const std::string& path, const std::vector<std::string>& principals) {
  const Answer answer = Ask(path, principals);
  std::vector<std::optional<unsigned>> users;
  users.reserve(answer.users.size());
  for (const std::string& user : answer.users) {
    users.push_back(user == "none" ? std::nullopt : std::optional<unsigned>(std::stoul(user)));
  }
  return users;
}

std::string DomainByLibrary(const std::string& path) { return Ask(path, {}).domain; }
