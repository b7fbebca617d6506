#include "translation_methods.h"

#include <unistd.h>

#include <algorithm>
#include <optional>

namespace vorn {
namespace {

constexpr char kSection[] = "Translation";
constexpr char kGSSMethods[] = "GSS-Methods";
constexpr char kMethod[] = "Method";
constexpr char kStatic[] = "static";
constexpr char kCompiled[] = "vorn";

// Splits a list as libnfsidmap does: at commas; blanks before a name do not count, and blanks after it do.
std::vector<std::string> Split(std::string_view list) {
  std::vector<std::string> words;
  while (!list.empty()) {
    std::string_view word = list.substr(0, list.find(','));
    list.remove_prefix(std::min(word.size() + 1, list.size()));
    word.remove_prefix(std::min(word.find_first_not_of(" \t"), word.size()));
    if (!word.empty()) words.emplace_back(word);
  }
  return words;
}

std::vector<std::string> ListOf(const IniFiles& files, const char* key) {
  const std::optional<IniFound> found = files.Find(kSection, key);
  return found ? Split(found->value) : std::vector<std::string>();
}

bool IsForStaticMappings(const std::string& method) { return method == kStatic || method == kCompiled; }

bool Exists(const Box& box, const std::string& path) {
  const Result<std::string> location = box.root().Locate(path);
  return location.ok() && access(location->c_str(), F_OK) == 0;
}

// The folder in which libnfsidmap looks for plug-ins, or "".
std::string PluginFolder(const Box& box) {
  constexpr const char* kFolders[] = {"/usr/lib/" VORN_LIBRARY_ARCHITECTURE "/libnfsidmap", "/usr/lib64/libnfsidmap",
                                      "/usr/lib/libnfsidmap"};
  for (const char* folder : kFolders) {
    if (Exists(box, folder)) return folder;
  }
  return "";
}

}  // namespace

std::vector<std::string> GSSMethods(const IniFiles& files) {
  std::vector<std::string> methods = ListOf(files, kGSSMethods);
  if (methods.empty()) methods = ListOf(files, kMethod);
  if (methods.empty()) methods = {"nsswitch"};
  return methods;
}

std::string StaticMethod(const Box& box) {
  const std::string folder = PluginFolder(box);
  return !folder.empty() && Exists(box, folder + "/" + kCompiled + ".so") ? kCompiled : kStatic;
}

bool IsStaticFirst(const std::vector<std::string>& methods) {
  return !methods.empty() && IsForStaticMappings(methods.front());
}

bool UseOnlyCompiledMappings(const IniFiles& files) {
  std::vector<std::string> methods = GSSMethods(files);
  const bool is_first = methods.front() == kCompiled;
  for (const char* key : {kMethod, kGSSMethods}) {
    for (const std::string& method : ListOf(files, key)) methods.push_back(method);
  }
  return is_first && std::find(methods.begin(), methods.end(), kStatic) == methods.end();
}

Status PutStaticFirst(const std::vector<std::string>& methods, const std::string& method, IniDocument* document) {
  std::string list = method;
  for (const std::string& other : methods) {
    if (!IsForStaticMappings(other)) list += "," + other;
  }
  const std::optional<IniValue> value = IniValue::From(list);
  if (!value) return Status::Failure(kSyntax, "the translation methods cannot be written back");
  document->Set(*IniSection::From(kSection), *IniKey::From(kGSSMethods), *value);
  return {};
}

std::vector<std::string> MissingPlugins(const Box& box, const IniFiles& files) {
  std::vector<std::string> sentences;
  const std::string folder = PluginFolder(box);
  if (folder.empty()) return sentences;
  for (const char* key : {kMethod, kGSSMethods}) {
    for (const std::string& method : ListOf(files, key)) {
      std::string plugin = folder;
      plugin.append("/").append(method).append(".so");
      if (Exists(box, plugin)) continue;
      std::string sentence = files.Find(kSection, key)->Where();
      sentence.append(": ").append(key).append(" names \"").append(method).append("\", but ").append(plugin);
      sentence.append(" does not exist; libnfsidmap maps nobody until this is corrected");
      sentences.push_back(std::move(sentence));
    }
  }
  return sentences;
}

}  // namespace vorn
