#include "files.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/xattr.h>

#include <cerrno>
#include <csignal>
#include <cstdint>
#include <filesystem>
#include <fstream>

#include "file_descriptor.h"
#include "file_lock_waiters.h"
#include "injected_failures.h"
#include "processes.h"
#include "temporary_root.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;
using Names = std::vector<std::string>;

constexpr char kFile[] = "/etc/file";

Status Replace(const TemporaryRoot& root, std::string_view text, mode_t mode = 0644) {
  const Result<FileText> file = ReadFileOrNothing(root.At(kFile));
  if (!file.ok()) return file.status();
  return ReplaceFile(root.At(kFile), text, file->stamp, mode).status();
}

mode_t ModeOf(const std::string& path) {
  struct stat file {};
  return stat(path.c_str(), &file) == 0 ? file.st_mode & 07777 : 0;
}

// File times have a coarse resolution: two edits within one tick get the same time.
bool HasInodeClockPassed(const TemporaryRoot& root, std::int64_t time) {
  return Eventually([&] { return root.Write("/tick", ""), ReadFile(root.At("/tick"))->stamp.changed > time; });
}

TEST(ReadFile, GivesTheWholeText) {
  const TemporaryRoot root;
  const std::string text = std::string("a\0b\r\n", 5) + std::string(200'000, 'x');
  root.Write(kFile, text);
  const Result<FileText> file = ReadFile(root.At(kFile));
  ASSERT_TRUE(file.ok());
  EXPECT_EQ(file->text.size(), text.size());
  EXPECT_TRUE(file->text == text);
  EXPECT_TRUE(file->stamp.exists);
}

TEST(ReadFile, TellsNoFileFromAnEmptyOne) {
  const TemporaryRoot root;
  EXPECT_EQ(ReadFile(root.At(kFile)).status().code(), ENOENT);
  const Result<FileText> nothing = ReadFileOrNothing(root.At(kFile));
  ASSERT_TRUE(nothing.ok());
  EXPECT_FALSE(nothing->stamp.exists);
  root.Write(kFile, "");
  EXPECT_TRUE(ReadFileOrNothing(root.At(kFile))->stamp.exists);
}

TEST(ReadFile, RefusesWhatIsNoRegularFile) {
  const TemporaryRoot root;
  fs::create_directory(root.At("/folder"));
  ASSERT_EQ(mkfifo(root.At("/fifo").c_str(), 0600), 0);
  fs::create_symlink("/etc/passwd", root.At("/link"));
  EXPECT_EQ(ReadFile(root.At("/folder")).status().code(), EINVAL);
  EXPECT_EQ(ReadFile(root.At("/fifo")).status().code(), EINVAL);
  EXPECT_EQ(ReadFile(root.At("/link")).status().code(), ELOOP);
  EXPECT_EQ(ReadFileOrNothing(root.At("/folder")).status().code(), EINVAL);
}

TEST(ReadFile, RefusesAFileOfMoreThan64MiB) {
  const TemporaryRoot root;
  root.Write(kFile, "");
  fs::resize_file(root.At(kFile), (std::uintmax_t{64} << 20) + 1);
  EXPECT_EQ(ReadFile(root.At(kFile)).status().code(), EFBIG);
}

TEST(ReplaceFile, MakesTheFileAndTheFoldersAboveItWhateverTheUmaskSays) {
  const TemporaryRoot root;
  const mode_t before = umask(077);
  const Status status = ReplaceFile(root.At("/etc/nfs.conf.d/new.conf"), "text\n", FileStamp{}, 0640).status();
  umask(before);
  ASSERT_TRUE(status.ok()) << status.reason();
  EXPECT_EQ(root.Read("/etc/nfs.conf.d/new.conf"), "text\n");
  EXPECT_EQ(ModeOf(root.At("/etc/nfs.conf.d/new.conf")), 0640U);
  EXPECT_EQ(ModeOf(root.At("/etc/nfs.conf.d")), 0755U);
}

TEST(ReplaceFile, KeepsModeAndOwner) {
  const TemporaryRoot root;
  root.Write(kFile, "old");
  const bool privileged = geteuid() == 0;
  if (privileged) {
    ASSERT_EQ(chown(root.At(kFile).c_str(), 12, 34), 0);
  }
  ASSERT_EQ(chmod(root.At(kFile).c_str(), 04604), 0);
  ASSERT_TRUE(Replace(root, "new").ok());
  struct stat file {};
  ASSERT_EQ(stat(root.At(kFile).c_str(), &file), 0);
  EXPECT_EQ(file.st_uid, privileged ? 12U : geteuid());
  EXPECT_EQ(file.st_gid, privileged ? 34U : getegid());
  EXPECT_EQ(file.st_mode & 07777, 04604U);
  EXPECT_EQ(root.Read(kFile), "new");
}

std::string AttributeOf(const std::string& path, const char* name) {
  char value[256];
  const ssize_t size = getxattr(path.c_str(), name, value, sizeof value);
  return size < 0 ? "none" : std::string(value, static_cast<std::size_t>(size));
}

TEST(ReplaceFile, KeepsExtendedAttributesAndTheAccessControlList) {
  const TemporaryRoot root;
  root.Write(kFile, "old");
  // acl(5) in the kernel's form: version 2, then tag, permissions and id of each entry. User 1234 may read.
  const std::uint32_t acl[] = {2,          0x00060001, 0xFFFFFFFF, 0x00040002, 1234,      0x00000004,
                               0xFFFFFFFF, 0x00040010, 0xFFFFFFFF, 0x00000020, 0xFFFFFFFF};
  const std::pair<const char*, std::string> attributes[] = {
      {"user.note", "kept by hand"},
      {"system.posix_acl_access", std::string(reinterpret_cast<const char*>(acl), sizeof acl)}};
  for (const auto& [name, value] : attributes) {
    if (setxattr(root.At(kFile).c_str(), name, value.data(), value.size(), 0) != 0) {
      GTEST_SKIP() << "the file system of " << root.directory() << " has no " << name;
    }
  }
  const mode_t mode = ModeOf(root.At(kFile));
  ASSERT_TRUE(Replace(root, "new").ok());
  EXPECT_EQ(root.Read(kFile), "new");
  EXPECT_EQ(ModeOf(root.At(kFile)), mode);
  for (const auto& [name, value] : attributes) EXPECT_EQ(AttributeOf(root.At(kFile), name), value) << name;
}

TEST(ReplaceFile, WaitsForAProgramThatHasLockedTheFile) {
  const TemporaryRoot root;
  root.Write(kFile, "old");
  const FileStamp expected = ReadFile(root.At(kFile))->stamp;
  ChildProcess program([&] {
    const FileDescriptor file(open(root.At(kFile).c_str(), O_RDWR | O_CLOEXEC));
    if (!file || flock(file.get(), LOCK_EX) != 0) return 1;
    root.Write("/locked", "");
    if (!Eventually([&] { return HasLockWaiter(root.At(kFile)); })) return 2;
    return write(file.get(), "edited", 6) == 6 ? 0 : 3;
  });
  ASSERT_TRUE(Eventually([&] { return root.Read("/locked").has_value(); }));
  EXPECT_EQ(ReplaceFile(root.At(kFile), "new", expected).status().code(), kChangedBehind);
  EXPECT_EQ(program.Wait(), 0);
  EXPECT_EQ(root.Read(kFile), "edited");
}

TEST(ReplaceFile, LeavesTheOldFileToThoseWhoHaveItOpen) {
  const TemporaryRoot root;
  root.Write(kFile, "old");
  std::ifstream reader(root.At(kFile));
  ASSERT_TRUE(Replace(root, "a new text").ok());
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(reader), {}), "old");
}

TEST(ReplaceFile, NoticesAnEditBetweenReadAndWrite) {
  const TemporaryRoot root;
  const std::string path = root.At(kFile);
  const struct {
    const char* name;
    std::function<void()> edit;
  } cases[] = {
      {"other size", [&] { root.Write(kFile, "longer than before"); }},
      {"other file of the same text", [&] { root.Write("/etc/x", "old"), fs::rename(root.At("/etc/x"), path); }},
      {"removed", [&] { fs::remove(path); }},
      {"other mode", [&] { chmod(path.c_str(), 0600); }},
  };
  for (const auto& c : cases) {
    root.Write(kFile, "old");
    chmod(path.c_str(), 0644);
    const Result<FileText> file = ReadFile(path);
    ASSERT_TRUE(file.ok());
    ASSERT_TRUE(HasInodeClockPassed(root, file->stamp.changed));
    c.edit();
    const std::optional<std::string> edited = root.Read(kFile);
    EXPECT_EQ(ReplaceFile(path, "new", file->stamp).status().code(), kChangedBehind) << c.name;
    EXPECT_EQ(root.Read(kFile), edited) << c.name;
  }
}

TEST(ReplaceFile, NoticesAFileThatAppeared) {
  const TemporaryRoot root;
  root.Write(kFile, "somebody's");
  EXPECT_EQ(ReplaceFile(root.At(kFile), "new", FileStamp{}).status().code(), kChangedBehind);
  EXPECT_EQ(root.Read(kFile), "somebody's");
  EXPECT_EQ(root.Names("/etc"), Names{"file"});
}

TEST(ReplaceFile, RefusesATargetThatIsNoRegularFile) {
  const TemporaryRoot root;
  fs::create_directories(root.At("/etc/file"));
  EXPECT_EQ(ReplaceFile(root.At(kFile), "new", FileStamp{}).status().code(), EINVAL);
  fs::create_symlink("file", root.At("/etc/link"));
  EXPECT_EQ(ReplaceFile(root.At("/etc/link"), "new", FileStamp{}).status().code(), EINVAL);
  EXPECT_EQ(root.Names("/etc"), (Names{"file", "link"}));
}

TEST(ReplaceFile, OnAFullDiskLeavesTheOldFileAndNothingElse) {
  const TemporaryRoot root;
  root.Write(kFile, "old");
  ChildProcess writer([&] {
    std::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{4096, 4096};
    if (setrlimit(RLIMIT_FSIZE, &limit) != 0) return 99;
    return Replace(root, std::string(10'000, 'x')).code();
  });
  EXPECT_EQ(writer.Wait(), EFBIG);
  EXPECT_EQ(root.Read(kFile), "old");
  EXPECT_EQ(root.Names("/etc"), Names{"file"});
}

TEST(ReplaceFile, LeavesAWholeFileAndNothingElseWhicheverSystemCallFails) {
  const struct {
    const char* name;
    long number;
    const char* left;  // in the file
  } cases[] = {
      {"openat", SYS_openat, "old"}, {"write", SYS_write, "old"},         {"fsync", SYS_fsync, "old"},
      {"fchmod", SYS_fchmod, "old"}, {"renameat2", SYS_renameat2, "old"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write(kFile, "old");
    ChildProcess writer([&] {
      const Result<FileText> file = ReadFile(root.At(kFile));
      if (!FailSystemCall(c.number, EIO)) return 99;
      return ReplaceFile(root.At(kFile), "new", file->stamp).status().code();
    });
    EXPECT_EQ(writer.Wait(), EIO) << c.name;
    EXPECT_EQ(root.Read(kFile), c.left) << c.name;
    EXPECT_EQ(root.Names("/etc"), Names{"file"}) << c.name;
  }
}

TEST(ReplaceFile, LeavesAWholeFileWhereverItsProcessIsKilled) {
  const TemporaryRoot root;
  bool ended = false;
  int kills = 0;
  for (; !ended; ++kills) {
    root.Write(kFile, "old");
    ended = RunUntilSystemCall(kills, [&] { static_cast<void>(Replace(root, "a new text")); });
    const std::optional<std::string> left = root.Read(kFile);
    EXPECT_TRUE(left == "old" || left == "a new text") << kills << ": " << left.value_or("no file");
    ASSERT_TRUE(Replace(root, "next").ok()) << kills;
    EXPECT_EQ(root.Names("/etc"), Names{"file"}) << kills;
  }
  EXPECT_EQ(root.Read(kFile), "next");
  EXPECT_GT(kills, 10);
}

// A manual edit, in the two ways in which editors save: in place, and by a rename.
void EditInPlace(const TemporaryRoot& root) { root.Write(kFile, "somebody's own"); }

void EditByReplacing(const TemporaryRoot& root) {
  root.Write("/etc/other", "somebody's own");
  fs::rename(root.At("/etc/other"), root.At(kFile));
}

using Edit = void (*)(const TemporaryRoot& root);

// Returns 1 if one of two writes, one after the other, notices that somebody else has changed the file.
int WriteTwice(const TemporaryRoot& root, const FileStamp& read) {
  const Result<FileStamp> written = ReplaceFile(root.At(kFile), "new", read);
  if (!written.ok()) return written.status().code() == kChangedBehind ? 1 : 0;
  return ReplaceFile(root.At(kFile), "newer", *written).status().code() == kChangedBehind ? 1 : 0;
}

// Makes an edit at system call number `call` of two writes. Returns whether the writes made that many calls.
bool KeepsTheEditAt(int call, const char* before, Edit edit) {
  const TemporaryRoot root;
  fs::create_directory(root.At("/etc"));
  if (before != nullptr) root.Write(kFile, before);
  const FileStamp read = ReadFileOrNothing(root.At(kFile))->stamp;
  bool edit_is_later = false;
  const std::optional<int> noticed = InterruptAtSystemCall(
      call, [&] { return WriteTwice(root, read); },
      [&] {
        edit_is_later = root.Read(kFile) == "newer";
        edit(root);
      });
  if (!noticed) return false;
  EXPECT_EQ(root.Read(kFile), "somebody's own") << call;
  EXPECT_EQ(*noticed == 0, edit_is_later) << call;
  EXPECT_EQ(root.Names("/etc"), Names{"file"}) << call;
  return true;
}

TEST(ReplaceFile, LosesNoEditWheneverItIsMade) {
  const struct {
    const char* before;  // null: no file
    Edit edit;
  } cases[] = {{"old", EditInPlace}, {"old", EditByReplacing}, {nullptr, EditInPlace}};
  for (const auto& c : cases) {
    int call = 0;
    while (KeepsTheEditAt(call, c.before, c.edit) && !HasFailure()) ++call;
    EXPECT_GT(call, 10);
  }
}

TEST(ReplaceFile, SaysThatAMountPointCannotBeReplaced) {
  const TemporaryRoot root;
  root.Write(kFile, "old");
  ChildProcess writer([&] {
    if (!FailSystemCall(SYS_renameat2, EBUSY)) return 99;
    const Status status = Replace(root, "new");
    const bool has_reason = status.reason().find("is a mount point") != std::string::npos;
    return status.code() == EBUSY && has_reason ? 0 : 1;
  });
  EXPECT_EQ(writer.Wait(), 0);
  EXPECT_EQ(root.Read(kFile), "old");
  EXPECT_EQ(root.Names("/etc"), Names{"file"});
}

TEST(ReplaceFile, ReplacesOnAFileSystemThatCannotExchange) {
  for (const char* before : {"old", static_cast<const char*>(nullptr)}) {
    const TemporaryRoot root;
    if (before != nullptr) root.Write(kFile, before);
    ChildProcess writer([&] {
      if (!FailSystemCall(SYS_renameat2, EINVAL)) return 99;
      return Replace(root, "new").code();
    });
    EXPECT_EQ(writer.Wait(), 0);
    EXPECT_EQ(root.Read(kFile), "new");
    EXPECT_EQ(root.Names("/etc"), Names{"file"});
  }
}

TEST(ConfirmFile, EndsWhatAKilledWriterBegan) {
  const TemporaryRoot root;
  EXPECT_TRUE(ConfirmFile(root.At("/no/such/file")).ok());
  root.Write(kFile, "new");
  root.Write("/etc/.file.vorn-Ab12Cd", "old");
  EXPECT_TRUE(ConfirmFile(root.At(kFile)).ok());
  EXPECT_EQ(root.Names("/etc"), Names{"file"});
  ChildProcess other([&] { return FailSystemCall(SYS_fsync, EIO) ? ConfirmFile(root.At(kFile)).code() : 99; });
  EXPECT_EQ(other.Wait(), EIO) << "what is not durable must not be acknowledged";
}

TEST(RemoveLeftovers, TakesTheTemporaryFilesOfThatFileOnly) {
  const TemporaryRoot root;
  for (const char* name : {"file", ".file.vorn-Ab12Cd", ".file.vorn-", ".file.vorn-toolong", ".other.vorn-Ab12Cd"}) {
    root.Write("/etc/" + std::string(name), "");
  }
  RemoveLeftovers(root.At(kFile));
  EXPECT_EQ(root.Names("/etc"), (Names{".file.vorn-", ".file.vorn-toolong", ".other.vorn-Ab12Cd", "file"}));
  RemoveLeftovers(root.At("/no/such/folder"));
}

TEST(IsSettled, WaitsForTheEndOfTheUnitOfTheTimestamp) {
  constexpr std::int64_t kSecond = 1'000'000'000;
  const struct {
    const char* name;
    FileStamp stamp;
    std::int64_t now;
    bool settled;
  } cases[] = {
      {"a missing file", {}, 0, true},
      {"fine timestamps, the same tick", {true, 1, 2, 3, 4, 5 * kSecond + 7}, 5 * kSecond + 7, false},
      {"fine timestamps, a later tick", {true, 1, 2, 3, 4, 5 * kSecond + 7}, 5 * kSecond + 8, true},
      {"whole seconds, the same second", {true, 1, 2, 3, 4, 5 * kSecond}, 6 * kSecond - 1, false},
      {"whole seconds, the next second", {true, 1, 2, 3, 4, 5 * kSecond}, 6 * kSecond, true},
  };
  for (const auto& c : cases) EXPECT_EQ(IsSettled(c.stamp, c.now), c.settled) << c.name;
}

}  // namespace
}  // namespace vorn
