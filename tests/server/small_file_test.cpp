#include "small_file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>

#include "sandbox.h"

namespace vorn::server {
namespace {

TEST(SmallFile, HasItsTextAndMode) {
  const Sandbox sandbox;
  std::string error;
  sandbox.Write("file", "[log]\n");
  ASSERT_EQ(chmod(sandbox.File("file").c_str(), 0640), 0);
  const auto file = ReadSmallFile(sandbox.File("file"), &error);
  ASSERT_TRUE(file) << error;
  EXPECT_EQ(file->text, "[log]\n");
  EXPECT_EQ(file->mode, 0640U);
}

TEST(SmallFile, MayBeMissing) {
  const Sandbox sandbox;
  std::string error;
  EXPECT_FALSE(ReadSmallFile(sandbox.File("none"), &error));
  EXPECT_EQ(errno, ENOENT);
  EXPECT_EQ(error, sandbox.File("none") + ": No such file or directory");
}

TEST(SmallFile, IsARegularFileOfModestSize) {
  const Sandbox sandbox;
  std::string error;
  EXPECT_FALSE(ReadSmallFile(sandbox.path(), &error));
  EXPECT_NE(errno, ENOENT);
  EXPECT_EQ(error, sandbox.path() + ": not a regular file");
  ASSERT_EQ(mkfifo(sandbox.File("fifo").c_str(), 0600), 0);
  EXPECT_FALSE(ReadSmallFile(sandbox.File("fifo"), &error)) << "and nobody waits for its writer";
  sandbox.Write("large", std::string((1 << 20) + 1, '#'));
  EXPECT_FALSE(ReadSmallFile(sandbox.File("large"), &error));
  EXPECT_EQ(error, sandbox.File("large") + ": larger than 1 MiB");
}

}  // namespace
}  // namespace vorn::server
