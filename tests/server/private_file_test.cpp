#include "private_file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "sandbox.h"

namespace vorn::server {
namespace {

class PrivateFile : public testing::Test {
 protected:
  std::optional<std::string> Read() { return ReadPrivateFile(path_, &error_); }

  Sandbox sandbox_;
  std::string path_ = sandbox_.File("file");
  std::string error_;
};

TEST_F(PrivateFile, IsEmptyUntilItIsWritten) { EXPECT_EQ(Read(), ""); }

TEST_F(PrivateFile, HasWhatWasWrittenLastAndIsForItsOwnerOnly) {
  for (const char* content : {"first", "second"}) {
    ASSERT_TRUE(ReplacePrivateFile(path_, content, &error_)) << error_;
    EXPECT_EQ(Read(), content);
  }
  struct stat status {};
  ASSERT_EQ(stat(path_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
  const auto files = std::filesystem::directory_iterator(sandbox_.path());
  EXPECT_EQ(std::distance(begin(files), end(files)), 1) << "no temporary file is left";
}

TEST_F(PrivateFile, ThatOthersMayUseIsRefused) {
  ASSERT_TRUE(ReplacePrivateFile(path_, "text", &error_));
  for (const mode_t mode : {0640U, 0604U, 0622U}) {
    chmod(path_.c_str(), mode);
    error_.clear();
    EXPECT_EQ(Read(), std::nullopt) << mode;
    EXPECT_NE(error_.find(path_), std::string::npos);
  }
}

TEST_F(PrivateFile, IsNoLinkAndNoFolder) {
  ASSERT_TRUE(ReplacePrivateFile(sandbox_.File("other"), "text", &error_));
  std::filesystem::create_symlink("other", path_);
  EXPECT_EQ(Read(), std::nullopt);
  std::filesystem::remove(path_);
  std::filesystem::create_directory(path_);
  EXPECT_EQ(Read(), std::nullopt);
  EXPECT_FALSE(ReplacePrivateFile(path_, "text", &error_));
}

TEST_F(PrivateFile, CannotBeWrittenWithoutItsFolder) {
  EXPECT_FALSE(ReplacePrivateFile(sandbox_.File("none/file"), "text", &error_));
  EXPECT_NE(error_, "");
}

}  // namespace
}  // namespace vorn::server
