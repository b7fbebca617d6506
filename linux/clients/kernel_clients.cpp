#include "kernel_clients.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <utility>

#include "files.h"

namespace vorn {
namespace {

constexpr std::size_t kLargestInfo = std::size_t{64} << 10;  // a client chooses three texts of up to 1024 bytes
constexpr std::size_t kLargestStates = std::size_t{64} << 20;

FileDescriptor OpenAt(const FileDescriptor& folder, const std::string& name, int flags) {
  return FileDescriptor(openat(folder.get(), name.c_str(), flags | O_CLOEXEC));
}

// Reads a file of the kernel, which gives its text in pieces.
Result<std::string> ReadAt(const FileDescriptor& folder, const std::string& name, std::size_t largest) {
  const FileDescriptor file = OpenAt(folder, name, O_RDONLY);
  if (!file) return Status::System(errno, name);
  constexpr std::size_t kFurther = std::size_t{16} << 10;
  std::string text;
  for (std::size_t filled = 0;;) {
    text.resize(filled + kFurther);
    const ssize_t got = read(file.get(), text.data() + filled, kFurther);
    if (got < 0) return Status::System(errno, name);
    filled += static_cast<std::size_t>(got);
    if (filled > largest) return Status::System(EFBIG, name);
    if (got > 0) continue;
    text.resize(filled);
    return text;
  }
}

// A client that has left has no folder; while it leaves, its files cannot be read.
bool HasLeft(const Status& status) { return status.code() == ENOENT || status.code() == ENXIO; }

std::optional<std::uint64_t> NumberOf(const std::string& name) {
  std::uint64_t number = 0;
  const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), number);
  if (error != std::errc() || end != name.data() + name.size()) return std::nullopt;
  return number;
}

}  // namespace

Result<std::vector<KernelClient>> KernelClients::List() const {
  std::vector<KernelClient> clients;
  const FileDescriptor folder(open(folder_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder && errno == ENOENT) return clients;
  if (!folder) return Status::System(errno, folder_);
  const Result<std::vector<std::string>> names = ListFolder(folder_);
  if (!names.ok()) return names.status();
  for (const std::string& name : *names) {
    const std::optional<std::uint64_t> number = NumberOf(name);
    if (!number) continue;
    const Result<std::string> text = ReadAt(folder, name + "/info", kLargestInfo);
    if (HasLeft(text.status())) continue;
    if (!text.ok()) return text.status();
    clients.push_back({*number, ParseClientInfo(*text)});
  }
  std::sort(clients.begin(), clients.end(), [](const auto& a, const auto& b) { return a.number < b.number; });
  return clients;
}

std::optional<ClientStates> KernelClients::StatesOf(const KernelClient& client) const {
  const std::string path = folder_ + "/" + std::to_string(client.number);
  const FileDescriptor folder(open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  const Result<std::string> text = ReadAt(folder, "states", kLargestStates);
  if (!text.ok()) return std::nullopt;
  return CountClientStates(*text, client.info.client_id);
}

std::optional<std::int64_t> KernelClients::SinceOf(const KernelClient& client) const {
  struct stat status {};
  if (stat((folder_ + "/" + std::to_string(client.number)).c_str(), &status) != 0) return std::nullopt;
  return status.st_mtim.tv_sec;
}

Result<FileDescriptor> KernelClients::Open(std::uint64_t number, const std::string& client_id) const {
  const std::string path = folder_ + "/" + std::to_string(number);
  const Status left = Status::Failure(
      ENOENT, "There is no client " + std::to_string(number) + " with the client id " + client_id + " any more.");
  FileDescriptor folder(open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!folder) return errno == ENOENT ? left : Status::System(errno, path);
  const Result<std::string> text = ReadAt(folder, "info", kLargestInfo);
  if (HasLeft(text.status())) return left;
  if (!text.ok()) return text.status();
  if (ParseClientInfo(*text).client_id != client_id) return left;
  return folder;
}

Status KernelClients::Find(std::uint64_t number, const std::string& client_id) const {
  return Open(number, client_id).status();
}

Status KernelClients::Expire(std::uint64_t number, const std::string& client_id) const {
  const Result<FileDescriptor> folder = Open(number, client_id);
  if (!folder.ok()) return folder.status();
  const std::string name = folder_ + "/" + std::to_string(number) + "/ctl";
  const FileDescriptor control = OpenAt(*folder, "ctl", O_WRONLY);
  return control ? WriteAll(control.get(), "expire\n", name) : Status::System(errno, name);
}

}  // namespace vorn
