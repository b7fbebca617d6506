// Keytab files. libkrb5 accepts each keytab that the platform accepts, lists the same keys in the same order, finds
// each of them, and parses each principal that is listed.
#include <fcntl.h>
#include <krb5/krb5.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "file_descriptor.h"
#include "keytab_file.h"
#include "keytab_frame.h"
#include "require.h"

namespace {

using vorn::KeytabKey;

constexpr std::size_t kVersionSize = 2;

// libkrb5 as the programs of a box use it: with its default context, on a file.
class Library {
 public:
  Library() {
    setenv("KRB5_CONFIG", "/dev/null", 1);
    Require(krb5_init_context(&context_) == 0, "the library has a context");
  }
  ~Library() { krb5_free_context(context_); }
  Library(const Library&) = delete;
  Library& operator=(const Library&) = delete;

  krb5_context context() const { return context_; }

 private:
  krb5_context context_ = nullptr;
};

class File {
 public:
  explicit File(std::string_view content) : file_(memfd_create("keytab", MFD_CLOEXEC)) {
    const bool written = write(file_.get(), content.data(), content.size()) == static_cast<ssize_t>(content.size());
    Require(written, "the file is written");
  }
  std::string name() const { return "FILE:/proc/self/fd/" + std::to_string(file_.get()); }

 private:
  vorn::FileDescriptor file_;
};

class Principal {
 public:
  Principal(krb5_context context, const std::string& text) : context_(context) {
    Require(krb5_parse_name(context, text.c_str(), &principal_) == 0, "a listed principal is one");
  }
  ~Principal() { krb5_free_principal(context_, principal_); }
  Principal(const Principal&) = delete;
  Principal& operator=(const Principal&) = delete;

  krb5_const_principal get() const { return principal_; }

 private:
  krb5_context context_;
  krb5_principal principal_ = nullptr;
};

bool IsSameKey(krb5_context context, const KeytabKey& key, const krb5_keytab_entry& entry) {
  const Principal principal(context, key.principal);
  char name[64];
  const bool named = krb5_enctype_to_name(entry.key.enctype, 0, name, sizeof name) == 0;
  return static_cast<krb5_kvno>(key.version) == entry.vno &&
         krb5_principal_compare(context, principal.get(), entry.principal) != 0 &&
         key.enc_type == (named ? name : "etype " + std::to_string(entry.key.enctype));
}

void RequireSameList(krb5_context context, krb5_keytab keytab, const std::vector<KeytabKey>& keys) {
  krb5_kt_cursor cursor{};
  Require(krb5_kt_start_seq_get(context, keytab, &cursor) == 0, "the library reads what we accept");
  krb5_keytab_entry entry{};
  for (const KeytabKey& key : keys) {
    Require(krb5_kt_next_entry(context, keytab, &entry, &cursor) == 0, "the library lists every key");
    Require(IsSameKey(context, key, entry), "the library lists the same key");
    krb5_free_keytab_entry_contents(context, &entry);
  }
  Require(krb5_kt_next_entry(context, keytab, &entry, &cursor) == KRB5_KT_END, "the library lists no other key");
  krb5_kt_end_seq_get(context, keytab, &cursor);
}

// The lookup of rpc.svcgssd(8): by principal, with any version and encryption type.
void RequireFound(krb5_context context, krb5_keytab keytab, const KeytabKey& key) {
  const Principal principal(context, key.principal);
  krb5_keytab_entry entry{};
  Require(krb5_kt_get_entry(context, keytab, principal.get(), 0, 0, &entry) == 0, "the library finds a listed key");
  krb5_free_keytab_entry_contents(context, &entry);
}

void RequireSameByLibrary(std::string_view content, const std::vector<KeytabKey>& keys) {
  static const Library library;
  const File file(content);
  krb5_keytab keytab = nullptr;
  Require(krb5_kt_resolve(library.context(), file.name().c_str(), &keytab) == 0, "the library opens the file");
  RequireSameList(library.context(), keytab, keys);
  for (const KeytabKey& key : keys) RequireFound(library.context(), keytab, key);
  krb5_kt_close(library.context(), keytab);
}

// A file that is cut within its last entry, or that has a further byte, is not a keytab. Zeros at the end are padding.
void RequireWhole(std::string content, std::size_t count) {
  const auto longer = vorn::CountKeytabEntries(content + "x");
  Require(!longer.ok(), "nothing follows the last entry");
  const auto is_padded = [&] {
    return content.back() == '\0' && vorn::CountKeytabEntries(content.substr(0, content.size() - 1)).ok();
  };
  while (content.size() > kVersionSize && is_padded()) content.pop_back();
  if (content.size() == kVersionSize) return;
  const auto shorter = vorn::CountKeytabEntries(std::string_view(content).substr(0, content.size() - 1));
  Require(!shorter.ok(), "the last entry is whole");
  const auto twice = vorn::ReadKeytab(content + content.substr(kVersionSize));
  Require(twice.ok() && twice->size() == 2 * count, "entries follow one another");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string content(reinterpret_cast<const char*>(data), size);
  const auto keys = vorn::ReadKeytab(content);
  if (!keys.ok()) {
    Require(keys.status().code() == vorn::kNoKeytab, "what is refused is no keytab");
    return 0;
  }
  RequireSameByLibrary(content, *keys);
  RequireWhole(content, keys->size());
  return 0;
}
