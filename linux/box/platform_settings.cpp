#include "platform_settings.h"

#include <unistd.h>

#include <charconv>

#include "ini_file.h"

namespace vorn {
namespace {

constexpr char kSection[] = "platform";

constexpr std::size_t kFewestChanges = 1000;  // of the history; a checkpoint packs fewer

// Whether the box was booted by systemd: sd_booted(3).
bool IsBootedBySystemd(const Box& box) { return box.root().is_box() && access("/run/systemd/system", F_OK) == 0; }

// A word of the file and the value that it stands for.
template <typename T>
struct Word {
  const char* text;
  T meaning;
};

template <typename T, std::size_t kSize>
Status ReadWord(const IniFile& file, const char* key, const Word<T> (&words)[kSize], T* result) {
  const std::optional<std::string> text = file.document().Get(kSection, key);
  if (!text) return {};
  std::string known;
  for (const Word<T>& word : words) {
    if (*text == word.text) {
      *result = word.meaning;
      return {};
    }
    known += std::string(known.empty() ? "" : ", ") + word.text;
  }
  return file.Refuse(kSection, key, "is none of: " + known);
}

Status ReadNumber(const IniFile& file, const char* key, std::size_t least, std::size_t* result) {
  const std::optional<std::string> text = file.document().Get(kSection, key);
  if (!text) return {};
  std::size_t number = 0;
  const char* const end = text->data() + text->size();
  const auto read = std::from_chars(text->data(), end, number);
  if (read.ec != std::errc() || read.ptr != end || number < least) {
    return file.Refuse(kSection, key, "is no number from " + std::to_string(least));
  }
  *result = number;
  return {};
}

}  // namespace

Result<std::shared_ptr<const PlatformSettings>> PlatformSettings::Load(Box& box) {
  const Result<SharedIniFile> file = IniFile::Open(box, "/etc/vorn/platform.conf");
  if (!file.ok()) return file.status();
  return box.Derive<PlatformSettings>("", {*file}, [&] { return Read(box, **file); });
}

Result<PlatformSettings> PlatformSettings::Read(const Box& box, const IniFile& file) {
  const EngineKind default_engine = IsBootedBySystemd(box) ? EngineKind::kSystemd : EngineKind::kLocal;
  PlatformSettings settings;
  settings.engine = default_engine;
  settings.firewall = box.root().is_box();
  settings.history = box.root().is_box();

  const Word<EngineKind> engines[] = {
      {"systemd", EngineKind::kSystemd}, {"local", EngineKind::kLocal}, {"auto", default_engine}};
  if (Status s = ReadWord(file, "service_engine", engines, &settings.engine); !s.ok()) return s;
  const Word<Kerberos> kerberos[] = {{"auto", Kerberos::kAuto}, {"yes", Kerberos::kYes}, {"no", Kerberos::kNo}};
  if (Status s = ReadWord(file, "kerberos", kerberos, &settings.kerberos); !s.ok()) return s;
  const Word<bool> switches[] = {{"yes", true}, {"no", false}};
  if (Status s = ReadWord(file, "firewall", switches, &settings.firewall); !s.ok()) return s;
  if (Status s = ReadWord(file, "withdraw_left_shares", switches, &settings.withdraw_left_shares); !s.ok()) return s;
  if (Status s = ReadWord(file, "history", switches, &settings.history); !s.ok()) return s;
  if (Status s = ReadNumber(file, "history_changes", kFewestChanges, &settings.history_changes); !s.ok()) return s;
  settings.admin_account = file.document().Get(kSection, "admin_account").value_or(settings.admin_account);
  settings.guest_account = file.document().Get(kSection, "guest_account").value_or(settings.guest_account);
  return settings;
}

}  // namespace vorn
