#include "keytab_file.h"

#include <profile.h>

#include <cerrno>
#include <utility>

#include "keytab_frame.h"
#include "krb5_library.h"
#include "memory_file.h"
#include "owned.h"

namespace vorn {
namespace {

// The context ignores krb5.conf(5), which has no influence on the format of a keytab.
Result<Krb5Context> NewContext() {
  profile_t profile = nullptr;
  if (profile_init_path("/dev/null", &profile) != 0) return Status::Failure(ENOMEM, "libkrb5 has no profile");
  const Owned<std::remove_pointer_t<profile_t>, profile_abandon> owned(profile);
  krb5_context context = nullptr;
  if (krb5_init_context_profile(profile, 0, &context) != 0) return Status::Failure(ENOMEM, "libkrb5 has no context");
  return Krb5Context(context);
}

// An open keytab that is being read.
class Reading {
 public:
  Reading(krb5_context context, const std::string& name) : context_(context) {
    error_ = krb5_kt_resolve(context_, name.c_str(), &keytab_);
    if (error_ != 0) return;
    error_ = krb5_kt_start_seq_get(context_, keytab_, &cursor_);
    begun_ = error_ == 0;
  }
  ~Reading() {
    if (begun_) krb5_kt_end_seq_get(context_, keytab_, &cursor_);
    if (keytab_ != nullptr) krb5_kt_close(context_, keytab_);
  }
  Reading(const Reading&) = delete;
  Reading& operator=(const Reading&) = delete;

  // False at the end, and at a failure.
  bool Next(krb5_keytab_entry* entry) {
    if (error_ == 0) error_ = krb5_kt_next_entry(context_, keytab_, entry, &cursor_);
    return error_ == 0;
  }
  bool at_end() const { return error_ == KRB5_KT_END; }
  krb5_error_code error() const { return error_; }

 private:
  krb5_context context_;
  krb5_keytab keytab_ = nullptr;
  krb5_kt_cursor cursor_{};
  krb5_error_code error_ = 0;
  bool begun_ = false;
};

}  // namespace

Result<std::vector<KeytabKey>> ReadKeytab(std::string_view content) {
  const Result<std::size_t> count = CountKeytabEntries(content);
  if (!count.ok()) return count.status();
  const Result<FileDescriptor> file = MakeMemoryFile("keytab", content);
  if (!file.ok()) return file.status();
  const Result<Krb5Context> context = NewContext();
  if (!context.ok()) return context.status();

  Reading reading(context->get(), "FILE:" + PathOf(*file));
  std::vector<KeytabKey> keys;
  for (krb5_keytab_entry entry{}; reading.Next(&entry);) {
    keys.push_back(
        {static_cast<int>(entry.vno), NameOf(context->get(), entry.principal), EncTypeName(entry.key.enctype)});
    krb5_free_keytab_entry_contents(context->get(), &entry);
  }
  if (!reading.at_end()) return NoKeytab(ErrorText(context->get(), reading.error()));
  if (keys.size() != *count) return NoKeytab("an entry cannot be read");
  return keys;
}

std::string PrintKeytab(std::string_view content) {
  const Result<std::vector<KeytabKey>> keys = ReadKeytab(content);
  if (!keys.ok()) return "(no keytab)\n";
  std::string text;
  for (const KeytabKey& key : *keys) {
    const std::string version = std::to_string(key.version);
    text += std::string(version.size() < 4 ? 4 - version.size() : 0, ' ') + version;
    text += " " + key.principal + " (" + key.enc_type + ") \n";
  }
  return text;
}

}  // namespace vorn
