#include "inverse_merge.h"

#include <git2.h>

#include <cerrno>

#include "owned.h"

namespace vorn {
namespace {

constexpr char kBegin[] = "<<<<<<< now";
constexpr char kEnd[] = ">>>>>>> before the change";

git_merge_file_input InputOf(const std::string& content) {
  git_merge_file_input input;
  git_merge_file_input_init(&input, GIT_MERGE_FILE_INPUT_VERSION);
  input.ptr = content.data();
  input.size = content.size();
  return input;
}

// The first conflict of a merged text.
std::string FirstConflict(const std::string& merged) {
  const std::size_t begin = merged.find(kBegin);
  const std::size_t end = merged.find(kEnd, begin == std::string::npos ? 0 : begin);
  if (begin == std::string::npos || end == std::string::npos) return merged;
  return merged.substr(begin, end - begin + sizeof kEnd - 1);
}

Result<InverseMerge> MergeText(const std::string& before, const std::string& after, const std::string& now) {
  static const int initialized = git_libgit2_init();
  if (initialized < 0) return Status::Failure(EIO, "libgit2 does not start");
  const git_merge_file_input base = InputOf(after);
  const git_merge_file_input ours = InputOf(now);
  const git_merge_file_input theirs = InputOf(before);
  git_merge_file_options options;
  git_merge_file_options_init(&options, GIT_MERGE_FILE_OPTIONS_VERSION);
  options.our_label = "now";
  options.their_label = "before the change";
  git_merge_file_result merged{};
  const int result = git_merge_file(&merged, &base, &ours, &theirs, &options);
  const Owned<git_merge_file_result, git_merge_file_result_free> owned(&merged);
  if (result < 0) return Status::Failure(EIO, "libgit2 cannot merge the versions of the file");
  std::string text(merged.ptr == nullptr ? "" : merged.ptr, merged.len);
  if (merged.automergeable != 0) return InverseMerge{false, "", std::move(text)};
  return InverseMerge{true, FirstConflict(text), std::nullopt};
}

}  // namespace

Result<InverseMerge> MergeInverse(const std::optional<std::string>& before, const std::optional<std::string>& after,
                                  const std::optional<std::string>& now) {
  if (now == before || now == after) return InverseMerge{false, "", before};
  if (before && after && now) return MergeText(*before, *after, *now);
  const char* const why = !now     ? "the file does not exist any more"
                          : !after ? "the file exists again, with another content"
                                   : "the change created the file, and later changes added to it";
  return InverseMerge{true, why, std::nullopt};
}

}  // namespace vorn
