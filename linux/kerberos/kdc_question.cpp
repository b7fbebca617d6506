#include "kdc_question.h"

#include <algorithm>
#include <condition_variable>
#include <map>
#include <mutex>
#include <string>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>

#include "keytab.h"
#include "program.h"

namespace vorn {
namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;
using Answers = KdcQuestion::Answers;

constexpr char kProgram[] = "/usr/libexec/vorn-ask-kdc";
constexpr char kSettings[] = "/etc/krb5.conf";
constexpr std::chrono::seconds kLimit{15};
constexpr KdcQuestion::Times kTimes{1s, 5min, 15min};

bool HasWrongKey(const Answers& answers) {
  return answers.ok() && std::any_of(answers->begin(), answers->end(), [](const KdcAnswer& answer) {
           return answer.state == KdcAnswer::State::kOutdated;
         });
}

Answers RunAsker(const std::string& root, const std::string& program) {
  ProgramOptions options;
  options.limit = kLimit;
  options.root = root;
  std::string output;
  const Status status = RunProgram(
      program, {}, [&](std::string_view line) { output.append(line).append("\n"); }, options);
  if (!status.ok()) return Status::Failure(status.code(), status.reason() + (output.empty() ? "" : ": " + output));
  return ParseAnswers(output);
}

}  // namespace

struct KdcQuestion::State {
  Asker ask;
  Times times;
  std::mutex mutex;
  std::condition_variable answered;
  bool is_asking = false;
  Clock::time_point asked;
  std::vector<Version> versions;  // of the question
  std::optional<Answers> answers;
  Clock::time_point fresh_until;
};

KdcQuestion::KdcQuestion(Asker ask, Times times) : state_(std::make_shared<State>()) {
  state_->ask = std::move(ask);
  state_->times = times;
}

std::optional<Answers> KdcQuestion::Get(const std::vector<Version>& versions) {
  std::unique_lock lock(state_->mutex);
  const bool is_known = state_->answers && state_->versions == versions;
  if (is_known && Clock::now() < state_->fresh_until) return state_->answers;
  if (!state_->is_asking) {
    if (!is_known) state_->answers.reset();
    state_->versions = versions;
    const auto ask = [state = state_] {
      Answers answers = state->ask();
      const std::lock_guard answer(state->mutex);
      state->fresh_until = Clock::now() + (HasWrongKey(answers) ? state->times.age_if_wrong : state->times.age);
      state->answers = std::move(answers);
      state->is_asking = false;
      state->answered.notify_all();
    };
    try {
      std::thread(ask).detach();
    } catch (const std::system_error&) {
      return state_->answers;  // the system has no thread to spare: a later call tries again
    }
    state_->is_asking = true;
    state_->asked = Clock::now();
  }
  state_->answered.wait_until(lock, state_->asked + state_->times.patience, [&] { return !state_->is_asking; });
  return state_->versions == versions ? state_->answers : std::nullopt;
}

std::optional<Answers> AskedKdc(const Box& box) {
  if (!box.Exists(kProgram)) return Status::Failure(kUnsupported, std::string(kProgram) + " is not installed.");
  const Result<std::string> program = box.root().Locate(kProgram);
  if (!program.ok()) return program.status();
  std::vector<Version> versions;
  for (const char* path : {kKeytabFile, kSettings}) {
    const Result<Version> version = box.store().VersionOf(path);
    if (!version.ok()) return version.status();
    versions.push_back(*version);
  }
  // Never destroyed: a thread may run while the process exits.
  static auto* mutex = new std::mutex;
  static auto* questions = new std::map<std::string, KdcQuestion>;
  std::unique_lock lock(*mutex);
  const std::string& root = box.root().directory();
  const auto ask = [root, program = *program] { return RunAsker(root, program); };
  KdcQuestion question = questions->try_emplace(root, ask, kTimes).first->second;
  lock.unlock();
  return question.Get(versions);
}

}  // namespace vorn
