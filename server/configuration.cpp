#include "configuration.h"

#include <cerrno>
#include <optional>
#include <string_view>
#include <utility>

#include "settings_file.h"
#include "small_file.h"

namespace vorn::server {
namespace {

struct Override {
  std::string_view option;
  std::string_view section;
  std::string_view key;
  std::string value;
};

std::string Join(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text.append(text.empty() ? "" : " ").append(word);
  return text;
}

std::vector<Override> OverridesOf(const Options& options) {
  std::vector<Override> overrides;
  const auto add = [&overrides](std::string_view option, std::string_view section, std::string_view key,
                                std::string value) {
    if (!value.empty()) overrides.push_back({option, section, key, std::move(value)});
  };
  add("--listen", "server", "listen", Join(options.listen));
  add("--host-name", "server", "host-names", Join(options.host_names));
  add("--modules", "server", "modules", options.modules);
  add("--administrators", "access", "administrators", options.administrators);
  add("--readers", "access", "readers", options.readers);
  return overrides;
}

std::string At(const std::string& path, const Place& place) {
  return path + ":" + std::to_string(place.line) + ":" + std::to_string(place.column) + ": ";
}

}  // namespace

std::string ConfigurationPath(const Options& options) {
  if (!options.config.empty()) return options.config;
  return (options.root == "/" ? "" : options.root) + "/etc/vorn/vornd.conf";
}

Configuration LoadConfiguration(const Options& options) {
  const std::string path = ConfigurationPath(options);
  std::string error;
  const std::optional<SmallFile> content = ReadSmallFile(path, &error);
  const bool may_be_missing = options.config.empty() && errno == ENOENT;
  if (!content && !may_be_missing) return {{}, {error}};
  SettingsFile file = ParseSettings(content ? content->text : "");
  Configuration loaded{std::move(file.settings)};
  for (const FileFault& fault : file.faults) loaded.faults.push_back(At(path, fault.place) + fault.text);
  for (const Override& each : OverridesOf(options)) {
    const Setting* setting = FindSetting(each.section, each.key);
    if (const auto fault = setting->parse(each.value, &loaded.settings)) {
      loaded.faults.push_back(std::string(each.option) + ": " + fault->text);
    }
  }
  if (!loaded.faults.empty()) return loaded;
  for (const Contradiction& found : FindContradictions(loaded.settings)) {
    auto place = file.places.find(found.setting);
    if (place == file.places.end()) place = file.places.find(found.other);  // the file has this one of the two
    loaded.faults.push_back((place == file.places.end() ? path + ": " : At(path, place->second)) +
                            std::string(found.setting->key) + " " + found.text);
  }
  return loaded;
}

std::vector<std::string> NeedRestart(const Settings& current, const Settings& next) {
  std::vector<std::string> keys;
  for (const Setting& each : SettingsTable()) {
    if (each.reloads || each.format(current) == each.format(next)) continue;
    keys.push_back("[" + std::string(each.section) + "] " + std::string(each.key));
  }
  return keys;
}

}  // namespace vorn::server
