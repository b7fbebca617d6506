#include "temporary_root.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace fs = std::filesystem;

TemporaryRoot::TemporaryRoot() : directory_((fs::temp_directory_path() / "vorn-test-XXXXXX").string()) {
  if (mkdtemp(directory_.data()) == nullptr) throw std::runtime_error("no temporary folder " + directory_);
  if (const char* previous = std::getenv("VORN_ROOT")) previous_ = previous;
  setenv("VORN_ROOT", directory_.c_str(), 1);
}

TemporaryRoot::~TemporaryRoot() {
  if (previous_) {
    setenv("VORN_ROOT", previous_->c_str(), 1);
  } else {
    unsetenv("VORN_ROOT");
  }
  std::error_code ignored;
  fs::remove_all(directory_, ignored);
}

void TemporaryRoot::Write(std::string_view path, std::string_view text) const {
  const fs::path file = At(path);
  fs::create_directories(file.parent_path());
  std::ofstream stream(file, std::ios::binary | std::ios::trunc);
  stream.write(text.data(), static_cast<std::streamsize>(text.size()));
  if (!stream.flush()) throw std::runtime_error("cannot write " + file.string());
}

std::optional<std::string> TemporaryRoot::Read(std::string_view path) const {
  std::ifstream stream(At(path), std::ios::binary);
  if (!stream) return std::nullopt;
  return std::string(std::istreambuf_iterator<char>(stream), {});
}

std::vector<std::string> TemporaryRoot::Names(std::string_view folder) const {
  std::vector<std::string> names;
  for (const fs::directory_entry& entry : fs::directory_iterator(At(folder))) names.push_back(entry.path().filename());
  std::sort(names.begin(), names.end());
  return names;
}
