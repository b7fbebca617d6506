#include "settings.h"

#include <unistd.h>

#include "ini_file.h"
#include "root.h"

namespace vorn {
namespace {

constexpr char kSection[] = "platform";

// sd_booted(3)
bool IsSystemdHere() { return Root::Current().is_box() && access("/run/systemd/system", F_OK) == 0; }

// One word out of a table of words.
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

}  // namespace

Result<Settings> Settings::Load() {
  const Result<IniFile> file = IniFile::Open("/etc/vorn/platform.conf");
  if (!file.ok()) return file.status();
  const Engine usual_engine = IsSystemdHere() ? Engine::kSystemd : Engine::kLocal;
  Settings settings;
  settings.engine = usual_engine;
  settings.firewall = Root::Current().is_box();

  const Word<Engine> engines[] = {{"systemd", Engine::kSystemd}, {"local", Engine::kLocal}, {"auto", usual_engine}};
  if (Status s = ReadWord(*file, "service_engine", engines, &settings.engine); !s.ok()) return s;
  const Word<Kerberos> kerberos[] = {{"auto", Kerberos::kAuto}, {"yes", Kerberos::kYes}, {"no", Kerberos::kNo}};
  if (Status s = ReadWord(*file, "kerberos", kerberos, &settings.kerberos); !s.ok()) return s;
  const Word<bool> firewall[] = {{"yes", true}, {"no", false}};
  if (Status s = ReadWord(*file, "firewall", firewall, &settings.firewall); !s.ok()) return s;
  settings.admin_account = file->document().Get(kSection, "admin_account").value_or(settings.admin_account);
  settings.guest_account = file->document().Get(kSection, "guest_account").value_or(settings.guest_account);
  return settings;
}

}  // namespace vorn
