// Fuzzes the parameters of all methods, with the box in any state and any platform call failing or throwing.
// Properties: a request is answered exactly once, or ends with a foreseen exception; no object is leaked; every log
// line has its form.
#include <json/reader.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

#include "api_table.h"
#include "fake_platform.h"
#include "furnished_box.h"
#include "handler.h"
#include "require.h"

namespace {

constexpr std::size_t kRows = 15;
constexpr std::size_t kHead = 3;  // method, state of the box, failing call
constexpr char kUploads[] = "/dev/null/";

// Parses JSON as leniently as a web server may: comments, NaN, lone surrogates, any root, any depth of the reader.
std::optional<Json::Value> ReadLeniently(std::string_view text) {
  Json::CharReaderBuilder builder;
  builder["collectComments"] = false;
  builder["allowSpecialFloats"] = true;
  builder["allowSingleQuotes"] = true;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value value;
  std::string errors;
  try {
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) return std::nullopt;
  } catch (const Json::Exception&) {  // nested too deep
    return std::nullopt;
  }
  return value;
}

// The module deletes the file that the server names as an upload. The path is changed to one that cannot exist.
void ConfineUpload(Json::Value* params) {
  if (!params->isObject() || !(*params)["keytab_file_tmp"].isString()) return;
  Json::Value& upload = (*params)["keytab_file_tmp"];
  upload = kUploads + upload.asString();
}

// Each bit of the state adds something to the box or removes it.
void FurnishBox(FakePlatform* platform, unsigned state) {
  Furnish(platform, static_cast<int>(state & 1));
  platform->kerberos_support = (state & 2) != 0 ? 0 : 1;
  platform->has_table = (state & 4) == 0;
  platform->mount_point_result = (state & 8) != 0 ? 1 : 0;
  platform->has_realm = platform->has_domain = (state & 16) == 0;
  platform->files = {std::string(kUploads) + "keytab"};
  if ((state & 16) != 0) platform->port_conflicts = {"nfs_statd 32765", "nfs_nlm 32766"};
  if ((state & 8) != 0) platform->keytab_import_result = VORNNFS_KEYTAB_NO_KEYTAB;
  if ((state & 32) == 0) return;
  platform->mappings = {{"alice@BOX.EXAMPLE", "alice"}, {"admin/box@BOX.EXAMPLE", "root"}};
  ExportRule rule{};
  std::strcpy(rule.client, "10.0.0.0/8");
  platform->rules = {rule, rule};
  KeytabEntry key{};
  std::strcpy(key.principal, "nfs/box.example@BOX.EXAMPLE");
  platform->keytab = {key};
}

bool IsControl(char c) { return static_cast<unsigned char>(c) < 0x20; }

bool IsRequestLine(const LogLine& line) { return line.text.rfind("Request: ", 0) == 0; }

// Checks that a log line begins with its call site, and that a logged request is a single line.
void CheckLine(const LogLine& line) {
  constexpr const char* kSources[] = {"handler", "nfs", "nfsAdv", "kerberos", "idmap", "share_privilege"};
  const bool known = std::any_of(std::begin(kSources), std::end(kSources), [&](auto s) { return line.source == s; });
  Require(line.priority == 3 && known && line.line > 0 && !line.text.empty(), "a log line has its place");
  if (!IsRequestLine(line)) return;
  const auto breaks = std::count_if(line.text.begin(), line.text.end(), IsControl);
  Require(breaks == 1 && line.text.back() == '\n', "a logged request is one line");
}

bool IsKnown(int code) {
  constexpr int kCodes[] = {kBadParameter,    kPlatformFailure, kPortConflict,      kKerberosUnsupported,
                            kNoKeytab,        kNoUpload,        kPrincipalMapped,   kNoLocalUser,
                            kPrincipalSymbol, kNoShare,         kShareNotExportable};
  return std::find(std::begin(kCodes), std::end(kCodes), code) != std::end(kCodes);
}

void CheckAnswer(const FakePlatform& platform, const VORN::APIResponse& response) {
  const auto is_answer = [](const std::string& call) { return call == "SetSuccess" || call == "SetError"; };
  Require(std::count_if(platform.calls.begin(), platform.calls.end(), is_answer) == 1, "one answer");
  Require(response.error() == 0 || IsKnown(response.error()), "a known code");
  const auto requests = std::count_if(platform.log.begin(), platform.log.end(), IsRequestLine);
  Require(requests == (response.error() == 0 ? 0 : 1), "a failed request is logged once");
}

// Runs the method. Returns whether it returned; otherwise it ended with a foreseen exception.
bool Run(const APIRow& row, VORN::APIRequest* request, VORN::APIResponse* response) {
  try {
    row.handler(request, response);
    return true;
  } catch (const Json::Exception&) {  // a value of the wrong type where the type does not matter
    return false;
  } catch (const std::runtime_error&) {  // thrown on demand
    return false;
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < kHead) return 0;
  std::optional<Json::Value> params = ReadLeniently({reinterpret_cast<const char*>(data) + kHead, size - kHead});
  if (!params) return 0;
  ConfineUpload(&*params);

  FakePlatform platform;
  FurnishBox(&platform, data[1]);
  const auto failing = static_cast<std::uint8_t>(data[2] - '0');
  if (failing < 128) {
    platform.FailCall(failing);
  } else {
    platform.ThrowCall(failing - 127);
  }
  {
    VORN::APIRequest request(std::move(*params));
    VORN::APIResponse response;
    if (Run(gTable[static_cast<std::uint8_t>(data[0] - 'a') % kRows], &request, &response)) {
      CheckAnswer(platform, response);
    }
  }
  Require(platform.live_objects.empty(), "nothing stays alive");
  for (const LogLine& line : platform.log) CheckLine(line);
  return 0;
}
