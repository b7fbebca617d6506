#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <optional>

#include "call.h"
#include "core.h"
#include "temporary_root.h"

namespace {

namespace fs = std::filesystem;

constexpr char kKrb5[] = "/etc/nfs/krb5.conf";

std::optional<std::string> Get(const char* path, const char* section, const char* key) {
  char buffer[512];
  const int length = KLIBCFileGetSectionValue(path, section, key, buffer, sizeof buffer);
  if (length < 0) return std::nullopt;
  EXPECT_EQ(static_cast<std::size_t>(length), std::strlen(buffer));
  return buffer;
}

TEST(SectionValue, OfAnIniFile) {
  const TemporaryRoot root;
  root.Write("/etc/x.conf", "[a]\nk = v # w\n");
  EXPECT_EQ(Get("/etc/x.conf", "A", "K"), "v");
  EXPECT_EQ(Get("/etc/x.conf", "a", "j"), std::nullopt);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
  EXPECT_EQ(Get("/etc/none.conf", "a", "k"), std::nullopt);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
}

TEST(SectionValue, IsNeverCut) {
  const TemporaryRoot root;
  root.Write("/etc/x.conf", "[a]\nk = abc\n");
  char buffer[4] = "old";
  EXPECT_LT(KLIBCFileGetSectionValue("/etc/x.conf", "a", "k", buffer, 3), 0);
  EXPECT_EQ(KLIBCErrGet(), ERANGE);
  EXPECT_STREQ(buffer, "old");
  EXPECT_EQ(KLIBCFileGetSectionValue("/etc/x.conf", "a", "k", buffer, 4), 3);
  EXPECT_LT(KLIBCFileGetSectionValue("/etc/x.conf", "a", "k", buffer, -1), 0);
  EXPECT_LT(KLIBCFileGetSectionValue("/etc/x.conf", "a", "k", nullptr, 4), 0);
}

TEST(SectionValue, IsRefusedIfItIsNotUtf8) {
  const TemporaryRoot root;
  root.Write("/etc/x.conf", "[a]\nk = b\xe4r\n");
  root.Write(kKrb5, "[libdefaults]\ndefault_realm = B\xc4R.EXAMPLE\n");
  EXPECT_EQ(Get("/etc/x.conf", "a", "k"), std::nullopt);
  EXPECT_EQ(KLIBCErrGet(), EILSEQ);
  EXPECT_EQ(Get(kKrb5, "libdefaults", "default_realm"), std::nullopt);
  EXPECT_EQ(KLIBCErrGet(), EILSEQ);
}

struct Krb5Case {
  const char* name;
  const char* text;
  const char* realm;  // null: none
};

const Krb5Case kKrb5Cases[] = {
    {"plain", "[libdefaults]\n\tdefault_realm = A\n", "A"},
    {"no section", "default_realm = A\n", nullptr},
    {"comments", "# x\n[libdefaults]\n; default_realm = X\n  default_realm = A\n", "A"},
    {"comment signs are ordinary in a value", "[libdefaults]\ndefault_realm = A#b ;c\n", "A#b ;c"},
    {"quoted", "[libdefaults]\ndefault_realm = \"A b\\tc\"\n", "A b\tc"},
    {"the first one counts", "[libdefaults]\ndefault_realm = A\ndefault_realm = B\n", "A"},
    {"sections in upper case are others", "[LIBDEFAULTS]\ndefault_realm = A\n", nullptr},
    {"keys in upper case are others", "[libdefaults]\nDEFAULT_REALM = A\n", nullptr},
    {"below another section", "[realms]\n A = {\n  default_realm = X\n }\n[libdefaults]\n default_realm = A\n", "A"},
    {"inside braces", "[libdefaults]\n x = {\n  default_realm = X\n }\n", nullptr},
    {"after nested braces", "[libdefaults]\n x = {\n  y = {\n   z = 1\n  }\n }\n default_realm = A\n", "A"},
    {"final marker", "[libdefaults]*\n default_realm* = A\n[libdefaults]\n default_realm = B\n", "A"},
    {"no line feed at the end", "[libdefaults]\ndefault_realm = A", "A"},
    {"lines of two characters", "[libdefaults]\r\ndefault_realm = A\r\n", "A"},
    {"module line", "module /lib/x.so:y\n[libdefaults]\ndefault_realm = A\n", "A"},
    {"included file", "include /etc/inc.conf\n[libdefaults]\n", "INCLUDED"},
    {"included first", "include /etc/inc.conf\n[libdefaults]\ndefault_realm = A\n", "INCLUDED"},
    {"included last", "[libdefaults]\ndefault_realm = A\ninclude /etc/inc.conf\n", "A"},
    {"section goes on below an include", "[libdefaults]\ninclude /etc/other.conf\ndefault_realm = A\n", "A"},
    {"included inside braces", "[libdefaults]\n x = {\n include /etc/inc.conf\n y = 1\n }\n", "INCLUDED"},
    {"included folder", "includedir /etc/krb5.conf.d\n", "FOLDER"},
    {"included by an included file", "include /etc/nested.conf\n", "INCLUDED"},
    {"includes of a link", "include /etc/link.conf\n", "INCLUDED"},
};

TEST(SectionValue, OfAKrb5ConfIsWhatTheKerberosLibraryReads) {
  const TemporaryRoot root;
  root.Write("/etc/inc.conf", "[libdefaults]\ndefault_realm = INCLUDED\n");
  root.Write("/etc/other.conf", "[realms]\nX = {\n}\n");
  root.Write("/etc/nested.conf", "include /etc/inc.conf\n");
  root.Write("/etc/krb5.conf.d/.hidden", "[libdefaults]\ndefault_realm = HIDDEN\n");
  root.Write("/etc/krb5.conf.d/a~", "[libdefaults]\ndefault_realm = BACKUP\n");
  root.Write("/etc/krb5.conf.d/realm_1", "[libdefaults]\ndefault_realm = FOLDER\n");
  fs::create_symlink("/etc/inc.conf", root.At("/etc/link.conf"));
  for (const Krb5Case& c : kKrb5Cases) {
    root.Write(kKrb5, c.text);
    const char* realm = c.realm == nullptr ? "none" : c.realm;
    EXPECT_EQ(Get(kKrb5, "libdefaults", "default_realm").value_or("none"), realm) << c.name;
  }
}

TEST(SectionValue, OfAFaultyKrb5ConfIsAFailure) {
  const TemporaryRoot root;
  const char* const texts[] = {"[libdefaults\n", "[libdefaults]\nx = {\n", "include /etc/none.conf\n",
                               "includedir /etc/none\n", "include /etc/nfs/krb5.conf\n"};
  for (const char* text : texts) {
    root.Write(kKrb5, text);
    EXPECT_EQ(Get(kKrb5, "libdefaults", "default_realm"), std::nullopt) << text;
  }
  fs::remove(root.At(kKrb5));
  EXPECT_EQ(Get(kKrb5, "libdefaults", "default_realm"), std::nullopt);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
}

TEST(FileExist, LooksBelowTheRoot) {
  const TemporaryRoot root;
  root.Write("/etc/nfs/krb5.keytab", "");
  fs::create_symlink("/nowhere", root.At("/etc/dangling"));
  EXPECT_NE(KLIBCFileExist("/etc/nfs/krb5.keytab"), 0);
  EXPECT_NE(KLIBCFileExist("/etc/nfs"), 0);
  EXPECT_EQ(KLIBCFileExist("/etc/nfs/none"), 0);
  EXPECT_EQ(KLIBCFileExist("/etc/dangling"), 0);
  EXPECT_EQ(KLIBCFileExist("/etc/passwd"), 0);
  EXPECT_EQ(KLIBCFileExist(""), 0);
  EXPECT_EQ(KLIBCFileExist(nullptr), 0);
}

TEST(FileExist, KnowsAnUploadOfTheCallByItsPathOnThisSystem) {
  const TemporaryRoot root;
  root.Write("/run/upload", "");
  root.Write("/run/other", "");
  EXPECT_EQ(KLIBCFileExist(root.At("/run/upload").c_str()), 0);
  VORN::CallDescription description;
  description.uploads = {root.At("/run/upload"), root.At("/run/gone")};
  const VORN::CallContext call(description);
  EXPECT_NE(KLIBCFileExist(root.At("/run/upload").c_str()), 0);
  EXPECT_EQ(KLIBCFileExist(root.At("/run/gone").c_str()), 0);
  EXPECT_EQ(KLIBCFileExist(root.At("/run/other").c_str()), 0);
}

}  // namespace
