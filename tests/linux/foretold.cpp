#include "foretold.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <optional>
#include <utility>

#include "call.h"
#include "core.h"
#include "rehearsal.h"
#include "tree_state.h"
#include "unified_diff.h"

namespace fs = std::filesystem;

namespace {

using Texts = std::map<std::string, std::string>;

constexpr char kKeytab[] = "/etc/nfs/krb5.keytab";

std::string ReadText(const std::string& path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

bool IsCompared(const std::string& path) {
  return path != "/var/lib/vorn/nfsd.state" && path.rfind("/run/vorn/", 0) != 0;
}

// The regular files below the root, by their paths on the box, without the uploads.
Texts TextsOf(const TemporaryRoot& root, const std::vector<std::string>& uploads) {
  Texts texts;
  for (const fs::directory_entry& entry : fs::recursive_directory_iterator(root.directory())) {
    const std::string& location = entry.path().native();
    const std::string path = location.substr(root.directory().size());
    const bool is_upload = std::find(uploads.begin(), uploads.end(), location) != uploads.end();
    if (entry.is_regular_file() && !entry.is_symlink() && !is_upload && IsCompared(path)) {
      texts[path] = ReadText(location);
    }
  }
  return texts;
}

std::optional<std::string> Find(const Texts& texts, const std::string& path) {
  const auto found = texts.find(path);
  return found == texts.end() ? std::nullopt : std::optional<std::string>(found->second);
}

// The differences of all files, as a rehearsal reports them. Of a keytab only that it differs.
Texts DifferencesBetween(const Texts& before, const Texts& after) {
  Texts differences;
  const auto compare = [&](const std::string& path) {
    const std::optional<std::string> old_text = Find(before, path);
    const std::optional<std::string> new_text = Find(after, path);
    if (old_text == new_text) return;
    differences[path] = path == kKeytab ? "" : vorn::UnifiedDiff(path, old_text, new_text);
  };
  for (const auto& [path, text] : before) compare(path);
  for (const auto& [path, text] : after) compare(path);
  return differences;
}

struct Answer {
  std::string outcome;
  std::vector<std::string> reasons;
  std::vector<std::string> warnings;
};

Answer Run(const Operation& operation, const std::vector<std::string>& uploads, const VORN::Draft* draft) {
  VORN::CallDescription description;
  description.method = "a test";
  description.uploads = uploads;
  description.draft = draft;
  const VORN::CallContext context(description);
  std::string outcome = operation();
  return {std::move(outcome), context.reasons(), context.warnings()};
}

Texts DifferencesOf(const VORN::Draft& draft) {
  Texts differences;
  for (const auto& file : draft.Report().files) {
    differences[file.path] = file.path == kKeytab ? "" : file.difference;
  }
  return differences;
}

Texts UploadsIn(const std::vector<std::string>& paths) {
  Texts uploads;
  for (const std::string& path : paths) uploads[path] = ReadText(path);
  return uploads;
}

}  // namespace

std::string ExpectForetold(const TemporaryRoot& root, const Operation& operation,
                           const std::vector<std::string>& uploads) {
  const Texts uploaded = UploadsIn(uploads);
  const Texts before = TextsOf(root, uploads);
  const TreeState state = StateOfTree(root.directory());
  const VORN::Draft draft;
  const Answer foretold = Run(operation, uploads, &draft);
  bool is_consumed = false;
  for (const auto& [path, text] : uploaded) {
    if (fs::exists(path)) continue;
    is_consumed = true;
    std::ofstream(path) << text;
  }
  if (is_consumed) {
    EXPECT_EQ(TextsOf(root, uploads), before);
  } else {
    EXPECT_EQ(StateOfTree(root.directory()), state);
  }
  const Answer real = Run(operation, uploads, nullptr);
  EXPECT_EQ(foretold.outcome, real.outcome);
  EXPECT_EQ(foretold.reasons, real.reasons);
  EXPECT_EQ(foretold.warnings, real.warnings);
  EXPECT_EQ(DifferencesOf(draft), DifferencesBetween(before, TextsOf(root, uploads)));
  return real.outcome;
}

int ExpectForetold(const TemporaryRoot& root, const std::function<int()>& operation,
                   const std::vector<std::string>& uploads) {
  int result = 0;
  const Operation with_code = [&] {
    result = operation();
    return std::to_string(result) + (result < 0 ? ", code " + std::to_string(KLIBCErrGet()) : "");
  };
  ExpectForetold(root, with_code, uploads);
  return result;
}
