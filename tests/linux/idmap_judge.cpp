#include "idmap_judge.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <sstream>
#include <system_error>
#include <utility>

namespace {

constexpr int kSignalled = 128;  // the status of the judge's answer, as a shell has it

struct Answer {
  std::string domain;
  std::vector<std::string> users;
};

// The judge program, which ends when this process has closed its connection.
class Judge {
 public:
  Judge() {
    int ends[2];
    Expect(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) == 0);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDIN_FILENO);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);  // the library's complaints
    char program[] = VORN_IDMAP_JUDGE;
    char* const arguments[] = {program, nullptr};
    pid_t unused = 0;
    errno = posix_spawn(&unused, program, &actions, nullptr, arguments, environ);
    posix_spawn_file_actions_destroy(&actions);
    Expect(errno == 0);
    close(ends[1]);
    questions_.reset(fdopen(dup(ends[0]), "w"));
    answers_.reset(fdopen(ends[0], "r"));
    Expect(questions_ != nullptr && answers_ != nullptr);
  }

  // Returns the status and the text of the answer.
  std::pair<int, std::string> Ask(const std::string& path, const std::vector<std::string>& principals) {
    Send(path);
    for (const std::string& principal : principals) Send(principal);
    Send("");
    Expect(std::fflush(questions_.get()) == 0);
    std::string text = Receive('\0');
    return {std::stoi(Receive('\n')), std::move(text)};
  }

 private:
  struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
  };

  static void Expect(bool condition) {
    if (!condition) throw std::system_error(errno, std::generic_category(), "the judge of idmapd.conf");
  }

  void Send(const std::string& text) {
    Expect(std::fwrite(text.c_str(), 1, text.size() + 1, questions_.get()) == text.size() + 1);
  }

  std::string Receive(char end) {
    std::string text;
    for (int byte = std::getc(answers_.get()); byte != end; byte = std::getc(answers_.get())) {
      Expect(byte != EOF);
      text += static_cast<char>(byte);
    }
    return text;
  }

  std::unique_ptr<std::FILE, CloseFile> questions_;
  std::unique_ptr<std::FILE, CloseFile> answers_;
};

Answer Ask(const std::string& path, const std::vector<std::string>& principals) {
  static Judge judge;
  const auto [status, text] = judge.Ask(path, principals);
  if (status >= kSignalled) throw LibraryCrash("the ID-mapping library crashes on " + path);
  if (status != 0) throw std::runtime_error("the ID-mapping library refuses " + path);
  std::istringstream lines(text);
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
