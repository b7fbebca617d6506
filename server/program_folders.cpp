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

}  // namespace

std::string DefaultModuleFolder() {
  std::error_code failure;
  const auto prefix = ProgramFolder().parent_path();
  const auto installed = prefix / VORN_MODULE_FOLDER;
  const auto built = prefix / "modules";
  return std::filesystem::is_directory(built, failure) ? built.string() : installed.string();
}

// In the build tree it is beside this program.
std::string PasswordHelperPath() {
  std::error_code failure;
  const auto built = ProgramFolder() / kHelperName;
  const auto installed = ProgramFolder().parent_path() / VORN_HELPER_FOLDER / kHelperName;
  return std::filesystem::exists(built, failure) ? built.string() : installed.string();
}

}  // namespace vorn::server
