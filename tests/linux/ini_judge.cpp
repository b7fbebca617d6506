#include "ini_judge.h"

#include <sstream>
#include <utility>

#include "ascii.h"
#include "processes.h"
#include "requirements.h"
#include "temporary_root.h"

namespace {

[[maybe_unused]] const bool kRequired = RequirePrograms({"nfsconf", "prlimit"});

std::string Unquoted(const std::string& value) {
  const bool quoted =
      value.size() > 1 && (value.front() == '"' || value.front() == '\'') && value.back() == value.front();
  return quoted ? value.substr(1, value.size() - 2) : value;
}

}  // namespace

IniContent ReadByNfsconf(std::string_view text) {
  const TemporaryRoot root;
  root.Write("/file.conf", text);
  std::istringstream dump(RunProgram({"nfsconf", "--file", root.At("/file.conf"), "--dump"}).output);
  IniContent content;
  std::string section;
  for (std::string line; std::getline(dump, line);) {
    const std::size_t equals = line.find(" = ");
    if (!line.empty() && line[0] == '[') {
      section = vorn::LowerAscii(line.substr(1, line.size() - 2));
    } else if (equals != std::string::npos) {
      content[section][vorn::LowerAscii(line.substr(1, equals - 1))] = Unquoted(line.substr(equals + 3));
    }
  }
  return content;
}

bool ArgumentsHideValues() { return ReadByNfsconf("[a]\nk=v\n[a \"x\"]\nk=w\n")["a"].empty(); }

std::optional<std::string> DumpByNfsconf(const std::string& path) {
  ProgramResult result = RunProgram({"nfsconf", "--file", path, "--dump"});
  return result.status == 0 ? std::optional<std::string>(std::move(result.output)) : std::nullopt;
}

std::optional<std::string> GetByNfsconf(const std::string& path, const std::string& section, const std::string& key) {
  constexpr char kCpuSeconds[] = "--cpu=1";  // the program follows a value that refers to itself without a pause
  ProgramResult result = RunProgram({"prlimit", kCpuSeconds, "nfsconf", "--file", path, "--get", section, key});
  if (result.status > 1) return std::nullopt;
  if (!result.output.empty() && result.output.back() == '\n') result.output.pop_back();
  return std::move(result.output);
}
