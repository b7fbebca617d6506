#include "console.h"

#include <syslog.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <system_error>
#include <utility>

#include "answer.h"
#include "entity_tag.h"
#include "response_writer.h"

namespace vorn::server {
namespace {

constexpr std::string_view kPage = "/index.html";
constexpr std::string_view kAssets = "/assets/";

struct MediaType {
  std::string_view extension;
  std::string_view type;
};

constexpr std::array<MediaType, 5> kTypes = {{{".html", "text/html; charset=utf-8"},
                                              {".js", "text/javascript; charset=utf-8"},
                                              {".css", "text/css; charset=utf-8"},
                                              {".svg", "image/svg+xml"},
                                              {".txt", "text/plain; charset=utf-8"}}};

// A browser runs and loads nothing but the console's own files, turns no string into markup or code, and shows the page
// in no frame.
constexpr const char* kPolicy =
    "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; font-src 'self'; connect-src 'self'; "
    "form-action 'self'; base-uri 'none'; frame-ancestors 'none'; require-trusted-types-for 'script'; "
    "trusted-types 'none'";

// Content that many answers share.
class SharedBody : public BodySource {
 public:
  explicit SharedBody(std::shared_ptr<const std::string> content) : content_(std::move(content)) {}

  std::optional<std::uint64_t> Size() const override { return content_->size(); }

  ssize_t Read(char* data, std::size_t size) override {
    const std::size_t count = content_->copy(data, size, sent_);
    sent_ += count;
    return static_cast<ssize_t>(count);
  }

 private:
  const std::shared_ptr<const std::string> content_;
  std::size_t sent_ = 0;
};

// Returns the media type of a file of the page; std::nullopt for other files.
std::optional<std::string_view> TypeOf(const std::string& path) {
  const std::string extension = std::filesystem::path(path).extension().string();
  const auto* found =
      std::find_if(kTypes.begin(), kTypes.end(), [&](const MediaType& each) { return each.extension == extension; });
  if (found == kTypes.end()) return std::nullopt;
  return found->type;
}

// Returns nullptr if the file cannot be read.
std::shared_ptr<const std::string> ReadContent(const std::string& path) {
  std::error_code failure;
  const std::uintmax_t size = std::filesystem::file_size(path, failure);
  if (failure) return nullptr;
  auto content = std::make_shared<std::string>(size, '\0');
  std::ifstream file(path, std::ios::binary);
  if (!file.read(content->data(), static_cast<std::streamsize>(size))) return nullptr;
  return content;
}

// The names of the assets have a digest of their content, so a browser need not ask for them again.
const char* CachingOf(std::string_view path) {
  return path.substr(0, kAssets.size()) == kAssets ? "public, max-age=31536000, immutable" : "no-cache";
}

}  // namespace

Console::Console(const std::string& folder) {
  std::error_code failure;
  std::filesystem::recursive_directory_iterator entry(folder, failure);
  for (; !failure && entry != std::filesystem::recursive_directory_iterator(); entry.increment(failure)) {
    std::error_code ignored;
    if (entry->is_regular_file(ignored)) Add(folder, entry->path().string().substr(folder.size()));
  }
  if (failure) syslog(LOG_WARNING, "%s: there is no console: %s", folder.c_str(), failure.message().c_str());
}

void Console::Add(const std::string& folder, const std::string& path) {
  const std::optional<std::string_view> type = TypeOf(path);
  if (!type) return;
  const std::string file = folder + path;
  const Content plain = ReadContent(file);
  if (plain == nullptr) {
    syslog(LOG_WARNING, "%s: cannot be read", file.c_str());
    return;
  }
  std::error_code ignored;
  const bool is_packed = std::filesystem::exists(file + ".gz", ignored);
  files_[path == kPage ? "/" : path] = {plain, is_packed ? ReadContent(file + ".gz") : nullptr, *type,
                                        EntityTagOf("", *plain)};
}

bool Console::Owns(std::string_view path) const {
  return files_.find(path) != files_.end() || path.substr(0, kAssets.size()) == kAssets;
}

Response Console::Get(const Head& head) const {
  const auto found = files_.find(head.target);
  if (found == files_.end()) return Refusal(404, "The console has no file \"" + std::string(head.target) + "\".");
  const File& file = found->second;
  const bool packed = file.packed != nullptr && FormOf(head, false).accepts_gzip;
  Response response;
  response.source = std::make_shared<SharedBody>(packed ? file.packed : file.plain);
  response.content_type = file.type;
  response.headers = {{"Cache-Control", CachingOf(head.target)},
                      {"ETag", packed ? CodedTag(file.tag) : file.tag},
                      {"Vary", "Accept-Encoding"},
                      {"Content-Security-Policy", kPolicy},
                      {"Referrer-Policy", "no-referrer"},
                      {"Cross-Origin-Opener-Policy", "same-origin"},
                      {"Cross-Origin-Resource-Policy", "same-origin"}};
  if (packed) response.headers.emplace_back("Content-Encoding", "gzip");
  return response;
}

}  // namespace vorn::server
