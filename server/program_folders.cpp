#include "program_folders.h"

#include <filesystem>
#include <system_error>

namespace vorn::server {
namespace {

constexpr const char* kHelperName = "vorn-pam-helper";

// The folder of this program.
std::filesystem::path ProgramFolder() {
  std::error_code failure;
  return std::filesystem::read_symlink("/proc/self/exe", failure).parent_path();
}

// Returns `built`, a folder of the build tree, if there is one; otherwise `installed`. Both are relative to the folder
// above the program's own.
std::string FolderOf(const char* built, const char* installed) {
  std::error_code failure;
  const auto prefix = ProgramFolder().parent_path();
  return std::filesystem::is_directory(prefix / built, failure) ? prefix / built : prefix / installed;
}

}  // namespace

std::string DefaultModuleFolder() { return FolderOf("modules", VORN_MODULE_FOLDER); }
std::string ConsoleFolder() { return FolderOf("page", VORN_CONSOLE_FOLDER); }

// In the build tree it is beside this program.
std::string PasswordHelperPath() {
  std::error_code failure;
  const auto built = ProgramFolder() / kHelperName;
  const auto installed = ProgramFolder().parent_path() / VORN_HELPER_FOLDER / kHelperName;
  return std::filesystem::exists(built, failure) ? built.string() : installed.string();
}

}  // namespace vorn::server
