#include "exports_document.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "exportfs_judge.h"
#include "exports_client.h"

namespace vorn {
namespace {

using std::string_literals::operator""s;  // NOLINT(misc-unused-using-decls): it is used
using testing::ElementsAre;
using testing::HasSubstr;

// Returns the access of each client to each path, up to the fault at which exportfs(8) stops.
using Table = std::map<std::pair<std::string, std::string>, std::string>;

Table TableOf(const std::string& text) {
  Table table;
  const auto lines = ExportsDocument(text).Lines();
  for (const ExportLine& line : *lines) {
    for (ExportEntry entry : line.entries) {
      // The table has no client that exportfs(8) cannot resolve.
      if (!CheckExportClient(entry.client).ok()) continue;
      entry.options.others.clear();
      table.insert({{line.path, ExportClientKey(entry.client)}, entry.options.Text()});
    }
    if (line.fault && line.fault->ends_file) break;
  }
  return table;
}

std::vector<std::string> Clients(const ExportsDocument& document, const std::string& path) {
  std::vector<std::string> clients;
  for (const ExportEntry& entry : document.Entries(path, ExportPaths())) clients.push_back(entry.client);
  return clients;
}

ExportEntry Entry(const std::string& client, const std::string& options) {
  ExportOptionReader reader;
  EXPECT_TRUE(reader.Apply(options).ok()) << options;
  return {client, reader.Options(), {}};
}

// The last line shows whether exportfs has read that far.
const std::string kLast = "\n/last 10.9.9.9(rw)\n";

const std::vector<std::string> kHosts = {"alpha", "beta.example", "gamma"};

const std::vector<std::string> kFiles = {
    "",
    "\n\n# nothing\n",
    "/a alpha(rw)" + kLast,
    "/a alpha" + kLast,
    "/a" + kLast,
    "/a -rw" + kLast,
    "/a -" + kLast,
    "/a -sec=krb5,rw alpha(ro) gamma(sec=sys) beta.example -all_squash 10.0.0.4(async)" + kLast,
    "/a alpha(ro) -rw" + kLast,
    "/a -ro -async alpha\n/b" + kLast,
    "/a alpha -ro -async\n/b alpha\n/c" + kLast,
    "/a alpha -ro -async\n/b -rw\n/c" + kLast,
    "/a alpha(sec=krb5,rw,sec=sys,ro,no_root_squash,sec=krb5i)" + kLast,
    "/a (ro)" + kLast,
    "/a alpha (rw)" + kLast,
    "/a -rw alpha (ro) gamma(async) " + kLast,
    "/a/ alpha(rw)\n//a gamma(ro)\n/a/./ *" + kLast,
    "\"/a b\" alpha(rw)" + kLast,
    "/a\\040b alpha(rw)" + kLast,
    "/a\" \"b alpha(rw)" + kLast,
    "/\\101\\134\\061 alpha(rw)" + kLast,
    "/\\134101 alpha(rw)" + kLast,
    "/a\\134\\061 alpha(rw)" + kLast,
    "/ha#sh alpha(rw) # comment" + kLast,
    "/a alpha(rw)#comment" + kLast,
    "/a alpha(rw) # comment \\\n/b gamma(rw)" + kLast,
    "/a \\\n alpha(rw) \\\n\tgamma(ro)" + kLast,
    "/a alpha(rw,\\\n no_wdelay)" + kLast,
    "/a\\\nalpha(rw)" + kLast,
    "\\\n/a alpha(rw)" + kLast,
    "# c \\\n/a alpha(rw)" + kLast,
    "/a alpha(rw) \\\n# gamma" + kLast,
    "/a \\\n" + kLast,
    "   /a alpha(rw)\n\t/b alpha(rw)" + kLast,
    "/a alpha(rw" + kLast,
    "/a gamma(ro) alpha(rw)x" + kLast,
    "/a alpha(rw)(ro)" + kLast,
    "/a alpha(rw),gamma(rw)" + kLast,
    "/a \"alpha(rw\n,async)\"" + kLast,
    "/a alpha(rw, async)" + kLast,
    "/a \"alpha( rw,async)\"" + kLast,
    "/a \"alpha(rw, async)\" gamma" + kLast,
    "/a \"alpha(rw,\t async, )\" gamma" + kLast,
    "/a \"alpha( )\" gamma" + kLast,
    "/a \"alpha(rw,async )\" gamma" + kLast,
    "/a \"alpha(rw,\nasync)\" gamma" + kLast,
    "/a alpha(sec=krb5,insecure,sec=sys,secure)" + kLast,
    "/a alpha(insecure,sec=krb5,ro,sec=sys,secure,rw) gamma(sec=sys:krb5,insecure)" + kLast,
    "/a \\\n/b alpha(rw)" + kLast,
    "/\\541 alpha(rw)" + kLast,
    "/a\\401\\377 alpha(rw)" + kLast,
    "/a 10.0.0.1(rw) 10.1(ro) 012.0.0.1(ro) fe80::/16 fe80:0::/16(rw)" + kLast,
    "/a alpha\"(rw)\"" + kLast,
    "/a \"alpha\"(rw)" + kLast,
    "/a -\"rw,async\" alpha" + kLast,
    "/a alpha(\\162w)" + kLast,
    "/a alpha\\050rw)" + kLast,
    "/a gamma alpha(foo)" + kLast,
    "/a -foo alpha" + kLast,
    "/a alpha(sec=foo)" + kLast,
    "/a alpha(fsid=x)" + kLast,
    "/a alpha(rw)\r\n# dos\r" + kLast,
    "/a alpha(rw) \r" + kLast,
    "/a alpha(rw)\f10.0.0.2(rw)" + kLast,
    "/a\v10.0.0.1(rw) 10.0.0.3" + kLast,
    "\f/a alpha(rw)" + kLast,
    "/a alpha(rw)\n\r" + kLast,
    "\"\" alpha(rw)" + kLast,
    "/a \"\" alpha(rw)" + kLast,
    "/a alpha(rw)\0gamma(ro)"s + kLast,
    "\0/a alpha(rw)"s + kLast,
    "/a \"alpha(rw)\0x\""s + kLast,
    "/a alpha(rw)",
    "/a alpha(rw) alpha(ro) ALPHA(async)\n/a alpha(all_squash)" + kLast,
    "/a 2001:db8::1(rw) 2001:0db8::1(ro) 10.0.0.1(rw) 10.0.0.1/32(ro)" + kLast,
    "/a *(rw) (ro)" + kLast,
    "\"/a\nb\" alpha(rw)" + kLast,
    "\"/a alpha(rw)\n\"/b alpha(rw)" + kLast,
    "\"/a alpha(rw)\n" + std::string(1100, '#') + kLast,
    "/a " + std::string(250, '*') + "(rw)" + kLast,
    "/a " + std::string(509, '*') + "(rw)" + kLast,
    "/" + std::string(1023, 'a') + " alpha" + kLast,
    "/" + std::string(1024, 'a') + " alpha" + kLast,
    "relative alpha" + kLast,
    "/ alpha(rw)" + kLast,
};

TEST(ExportsDocument, ReadsEveryFileAsExportfsDoes) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const auto verdicts = judge.Judge(kFiles, kHosts);
  for (std::size_t i = 0; i < kFiles.size(); ++i) {
    EXPECT_EQ(TableOf(kFiles[i]), TableOf(verdicts[i].table)) << kFiles[i] << verdicts[i].messages;
  }
}

// A file with a word that exportfs(8) may apply to the next line, and one that means the same if it does not.
struct LeftOverCase {
  std::string text;
  std::string cleared;
};

const std::vector<LeftOverCase> kLeftOverCases = {
    {"/a -ro -async\n/b\n/c" + kLast, "/a -ro -async\n/b *\n/c" + kLast},
    {"/a -ro -rw,async(insecure)\n\n# c\n\"/b\" # x" + kLast,
     "/a -ro -rw,async(insecure)\n\n# c\n\"/b\" * # x" + kLast},
    {"/a -ro \"-rw\" \n/b " + kLast, "/a -ro \"-rw\" \n/b *" + kLast},
    {"/a -ro \\055async\n/b" + kLast, "/a -ro \\055async\n/b *" + kLast},
    {"/a -ro -foo\n/b" + kLast, "/a -ro -foo\n/b *" + kLast},
};

TEST(ExportsDocument, ReadsAWordThatIsLeftOverAsExportfsMay) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  std::vector<std::string> files;
  for (const LeftOverCase& c : kLeftOverCases) files.push_back(c.text);
  const auto verdicts = judge.Judge(files, kHosts);
  for (std::size_t i = 0; i < files.size(); ++i) {
    EXPECT_THAT(TableOf(verdicts[i].table), testing::AnyOf(TableOf(files[i]), TableOf(kLeftOverCases[i].cleared)))
        << files[i] << verdicts[i].messages;
  }
}

// Makes files of random words, most of which are valid.
class FileMaker {
 public:
  explicit FileMaker(unsigned seed) : random_(seed) {}

  std::string Make() {
    std::string file;
    for (int lines = Up(8); lines >= 0; --lines) file += Line();
    return file;
  }

  template <typename List>
  std::string Any(const List& list) {
    return *(std::begin(list) + Up(static_cast<int>(std::size(list)) - 1));
  }

 private:
  int Up(int most) { return std::uniform_int_distribution<int>(0, most)(random_); }
  bool IsRare() { return Up(60) == 0; }

  std::string Line() {
    static constexpr const char* kPlain[] = {"\n", "# comment\n", "  # c \\\n", "\t\n", "\\\n"};
    if (Up(4) == 0) return Any(kPlain);
    static constexpr const char* kPaths[] = {"/mnt/a",       "/mnt/b",           "/mnt/a/", "\"/mnt/a b\"",
                                             "/mnt/a\\040b", "/mnt/b\\043\" \"", "//mnt/b", "  /mnt/c"};
    std::string line = Any(kPaths);
    for (int words = Up(4); words > 0; --words) line += Blank() + Word();
    static constexpr const char* kEnds[] = {"\n", " \n", " # end\n", " \\\n\n", "\r\n"};
    return line + Any(kEnds);
  }

  std::string Blank() { return Up(5) != 0 ? " " : Up(1) != 0 ? " \\\n\t" : "\t "; }

  std::string Word() {
    static constexpr const char* kFaults[] = {"alpha(rw", "\"", "gamma(foo)", "alpha(rw)x", "-bar", "\\"};
    if (IsRare()) return Any(kFaults);
    static constexpr const char* kClients[] = {"alpha",  "beta.example", "*",  "10.0.0.0/8",
                                               "@group", "*.ex[a-m]ple", "::1"};
    if (Up(6) == 0) return "-" + Options();
    return Any(kClients) + (Up(4) != 0 ? "(" + Options() + ")" : "");
  }

  std::string Options() {
    static constexpr const char* kOptions[] = {"rw",       "ro",        "async",     "no_root_squash", "all_squash",
                                               "sec=krb5", "sec=sys",   "insecure",  "sec=krb5i:krb5", "crossmnt",
                                               "fsid=5",   "no_wdelay", "anonuid=7", "subtree_check",  "no_all_squash"};
    std::string options = Any(kOptions);
    for (int more = Up(3); more > 0; --more) options += "," + Any(kOptions);
    return options;
  }

  std::mt19937 random_;
};

TEST(ExportsDocument, ReadsRandomFilesAsExportfsDoes) {
  const ExportfsJudge judge;
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  std::vector<std::string> files;
  for (unsigned seed = 0; seed < 200; ++seed) files.push_back(FileMaker(seed).Make());
  const auto verdicts = judge.Judge(files, kHosts);
  for (std::size_t i = 0; i < files.size(); ++i) {
    EXPECT_EQ(TableOf(files[i]), TableOf(verdicts[i].table)) << "seed " << i << ":\n"
                                                             << files[i] << verdicts[i].messages;
  }
}

// The text in which `entries` are the only ones of `path`.
Result<std::string> Replace(const ExportsDocument& document, const std::string& path,
                            const std::vector<ExportEntry>& entries, const ExportPaths& paths) {
  const Result<ExportsDocument> edited = document.Replace(path, entries, paths);
  if (!edited.ok()) return edited.status();
  return edited->text();
}

// Rewriting one path preserves every other line and its meaning to exportfs.
TEST(ExportsDocument, WritesWhatItReadsBackAndTouchesNothingElse) {
  const ExportfsJudge judge;
  const ExportPaths paths;
  std::vector<std::string> edited;
  for (unsigned seed = 0; seed < 200; ++seed) {
    const ExportsDocument document(FileMaker(seed).Make());
    std::vector<ExportEntry> entries = document.Entries("/mnt/b", paths);
    entries.push_back(Entry("fresh-" + std::to_string(seed), "rw,sec=krb5:sys,anonuid=5"));
    const auto text = Replace(document, "/mnt/b", entries, paths);
    if (!text.ok()) continue;
    const ExportsDocument again(*text);
    const auto same = Replace(again, "/mnt/b", again.Entries("/mnt/b", paths), paths);
    ASSERT_TRUE(same.ok()) << "seed " << seed;
    EXPECT_EQ(*same, *text) << "seed " << seed;
    const auto without = Replace(again, "/mnt/b", {}, paths);
    ASSERT_TRUE(without.ok()) << "seed " << seed;
    EXPECT_THAT(Clients(ExportsDocument(*without), "/mnt/b"), testing::IsEmpty()) << "seed " << seed;
    edited.push_back(*text);
  }
  EXPECT_GT(edited.size(), 150U);
  if (!judge.Unavailable().empty()) GTEST_SKIP() << judge.Unavailable();
  const auto verdicts = judge.Judge(edited, kHosts);
  for (std::size_t i = 0; i < edited.size(); ++i) {
    Table ours = TableOf(edited[i]);
    for (auto entry = ours.begin(); entry != ours.end();) {
      const bool unknown_host = entry->first.second.rfind("fresh-", 0) == 0;
      entry = unknown_host ? ours.erase(entry) : std::next(entry);
    }
    EXPECT_EQ(ours, TableOf(verdicts[i].table)) << edited[i] << verdicts[i].messages;
  }
}

TEST(ExportsDocument, FindsTheClientsOfAPathInAllItsLines) {
  const ExportsDocument document("/a b(rw)\n/b x\n\"/a\" c d # more\n/a/ e b(ro)\n/a/c y\n//./a f\n");
  EXPECT_THAT(Clients(document, "/a"), ElementsAre("b", "c", "d", "e", "f"));
  EXPECT_FALSE(document.Entries("/a", ExportPaths()).at(0).options.flavors.at(0).access.read_only);
  EXPECT_THAT(Clients(document, "/a/"), ElementsAre("b", "c", "d", "e", "f"));
  EXPECT_THAT(Clients(document, "/"), ElementsAre());
}

// The links /link -> /a and /home -> /volume1/home, and everything below.
class LinkedPaths : public ExportPaths {
 public:
  std::string Resolve(const std::string& path) const override {
    const std::string normal = NormalExportPath(path);
    if (normal == "/link") return "/a";
    return normal.rfind("/home", 0) == 0 ? "/volume1" + normal : normal;
  }
  Folder FolderAt(const std::string& path) const override {
    if (path != "/") return {Resolve(path), nullptr};
    return {path, std::make_shared<const Names>(Names{"link", "home"})};
  }
};

TEST(ExportsDocument, FindsTheLinesWhosePathIsALink) {
  const ExportsDocument document("/link b\n/a c\n\"/link/\" d\n/home/x e\n/volume1/home/x f\n/home g\n/links h\n");
  const auto clients = [&document](const std::string& path) {
    std::vector<std::string> found;
    for (const ExportEntry& entry : document.Entries(path, LinkedPaths())) found.push_back(entry.client);
    return found;
  };
  EXPECT_THAT(clients("/a"), ElementsAre("b", "c", "d"));
  EXPECT_THAT(clients("/link"), ElementsAre("b", "c", "d"));
  EXPECT_THAT(clients("/volume1/home/x"), ElementsAre("e", "f"));
  EXPECT_THAT(clients("/home/x"), ElementsAre("e", "f"));
  EXPECT_THAT(clients("/volume1/home"), ElementsAre("g"));
}

TEST(ExportsDocument, WritesThePathOfTheDirectoryInPlaceOfALink) {
  const ExportsDocument document("/link b # one\n/b x\n/a c # two\n");
  const auto text = Replace(document, "/a", {Entry("h", "rw")}, LinkedPaths());
  ASSERT_TRUE(text.ok()) << text.status().reason();
  EXPECT_EQ(*text, "/a h(rw,sync,root_squash,sec=sys) # one # two\n/b x\n");
}

struct EditCase {
  const char* name;
  std::string before;
  std::vector<ExportEntry> entries;  // of "/a"
  std::string after;
};

TEST(ExportsDocument, ReplacesTheLinesOfAPathByOne) {
  const std::vector<ExportEntry> one = {Entry("h", "rw")};
  const std::string line = "/a h(rw,sync,root_squash,sec=sys)\n";
  const EditCase cases[] = {
      {"empty file", "", one, line},
      {"new line at the end", "# c\n/b x\n", one, "# c\n/b x\n" + line},
      {"no line break at the end", "/b x", one, "/b x\n" + line},
      {"comment without a line break", "/b x # c", one, "/b x # c\n" + line},
      {"comment that ends in a backslash", "# c \\\n", one, "# c \\\n\n" + line},
      {"continued to nothing", "/b x \\\n", one, "/b x \\\n\n" + line},
      {"in its place", "/b x\n/a y(ro)\n/c z\n", one, "/b x\n" + line + "/c z\n"},
      {"comment kept", "/a y(ro)   # mine\n/c z\n", one, "/a h(rw,sync,root_squash,sec=sys) # mine\n/c z\n"},
      {"several lines become one", "/a x\n/b y\n/a z # kept\n# stays\n", one,
       "/a h(rw,sync,root_squash,sec=sys) # kept\n/b y\n# stays\n"},
      {"spelling of the path kept", "  \"/a\"\tx\n", one, "  \"/a\" h(rw,sync,root_squash,sec=sys)\n"},
      {"continuations go", "/a \\\n x \\\n y\n/b z\n", one, line + "/b z\n"},
      {"no entries, no line", "/b x\n/a y # c\n/c z\n", {}, "/b x\n/c z\n"},
      {"no entries and no line", "/b x\n", {}, "/b x\n"},
      {"faulty line of its own removed", "/c z\n/a x(foo) w\n/b y\n", {}, "/c z\n/b y\n"},
      {"faulty lines of others", "/b x(foo)\n/a y\n/c z(\n", one, "/b x(foo)\n" + line + "/c z(\n"},
  };
  for (const EditCase& c : cases) {
    const auto text = Replace(ExportsDocument(c.before), "/a", c.entries, ExportPaths());
    ASSERT_TRUE(text.ok()) << c.name << ": " << text.status().reason();
    EXPECT_EQ(*text, c.after) << c.name;
  }
}

TEST(ExportsDocument, FindsTheSameEntriesAfterEditsAsWithoutThem) {
  const char* const paths[] = {"/a", "/b", "/c", "/b c", "/d"};
  const char* const lines[] = {"/a h1(ro)\n", "/b h2 # note\n", "\n", "  /c h3\n", "# comment\n", "/d h1(rw) h4(ro)\n"};
  std::mt19937 random(3);
  const auto below = [&](std::size_t limit) { return random() % limit; };
  for (int file = 0; file < 300; ++file) {
    std::string made;
    for (std::size_t line = below(8); line > 0; --line) made += lines[below(std::size(lines))];
    if (below(3) == 0) made += "/c h5";
    ExportsDocument edited(made);
    for (int edit = 0; edit < 8; ++edit) {
      std::vector<ExportEntry> entries;
      for (std::size_t client = below(3); client > 0; --client) {
        entries.push_back(Entry("h" + std::to_string(client), below(2) == 0 ? "rw" : "ro"));
      }
      const Result<ExportsDocument> replaced = edited.Replace(paths[below(5)], entries, ExportPaths());
      ASSERT_TRUE(replaced.ok()) << replaced.status().reason();
      const std::string text = replaced->text();
      edited = ExportsDocument(text, edited);
      const ExportsDocument alone(text);
      for (const char* path : paths) {
        ASSERT_EQ(edited.Entries(path, ExportPaths()), alone.Entries(path, ExportPaths())) << path << " in " << text;
        ASSERT_EQ(replaced->Entries(path, ExportPaths()), alone.Entries(path, ExportPaths())) << path << " in " << text;
      }
    }
  }
}

TEST(ExportsDocument, KeepsTheWordsOfEntriesThatStay) {
  const ExportsDocument document("/a \"b\"(rw,async) -no_wdelay c\n");
  const auto text = Replace(document, "/a", document.Entries("/a", ExportPaths()), ExportPaths());
  ASSERT_TRUE(text.ok());
  EXPECT_EQ(*text, "/a \"b\"(rw,async) c(ro,sync,no_wdelay,root_squash,sec=sys)\n");
}

TEST(ExportsDocument, EscapesWhatThePathNeeds) {
  for (const char* path : {"/a b", "/new\nline", "/qu\"ote", "/back\\101slash", "/back\\541slash", "/#"}) {
    const auto text = Replace(ExportsDocument(""), path, {Entry("h", "")}, ExportPaths());
    ASSERT_TRUE(text.ok()) << path;
    EXPECT_THAT(Clients(ExportsDocument(*text), path), ElementsAre("h")) << path;
  }
}

TEST(ExportsDocument, RefusesWhatWouldNotReadBack) {
  const std::vector<ExportEntry> refused[] = {{Entry("a(rw) b", "")},
                                              {Entry("", "")},
                                              {Entry("-x", "")},
                                              {Entry("h", ""), Entry("H", "rw")},
                                              {Entry(std::string(510, 'x'), "")},
                                              {{"h", {}, "h(rw)"}},
                                              {{"h", {}, "h(ro) # "}, Entry("i", "")},
                                              {{"h", {}, "h(ro)\n/b z"}}};
  for (const auto& entries : refused) {
    const auto text = Replace(ExportsDocument("/b x\n"), "/a", entries, ExportPaths());
    EXPECT_EQ(text.status().code(), kRefusedText) << entries.front().client;
  }
}

TEST(ExportsDocument, RefusesToRewriteALineThatItDoesNotUnderstand) {
  for (const char* text :
       {"/a h1(rw) h2(rw, sync) h3(ro)\n", "/a x\n/a \"y\n", "/a x \\\n/b y(rw)\n", "/a x(sec=)\n"}) {
    const ExportsDocument document(text);
    EXPECT_EQ(Replace(document, "/a", {Entry("h", "")}, ExportPaths()).status().code(), kRefusedText) << text;
    const auto removed = Replace(document, "/a", {}, ExportPaths());
    ASSERT_TRUE(removed.ok()) << text;
    EXPECT_EQ(*removed, "") << text;
  }
}

TEST(ExportsDocument, RefusesToChangeWhatExportfsAppliesToTheNextLine) {
  const ExportsDocument document("/a -ro -all_squash\n/b x(rw)\n/c\n/d -ro -rw\n/e\n");
  const ExportPaths paths;
  EXPECT_TRUE(Replace(document, "/c", {Entry("h", "")}, paths).ok());
  EXPECT_FALSE(Replace(document, "/e", {Entry("h", "")}, paths).ok()) << "its access is an accident";
  EXPECT_FALSE(Replace(document, "/d", {}, paths).ok()) << "/e would lose the options";
  EXPECT_TRUE(Replace(document, "/b", {Entry("x", "ro")}, paths).ok());
  EXPECT_FALSE(Replace(document, "/b", {}, paths).ok()) << "/c would get the options";
  EXPECT_TRUE(Replace(document, "/e", {}, paths).ok());
}

TEST(ExportsDocument, RefusesToWriteIntoAnOpenQuotation) {
  for (const char* text : {"\"/b x", "/b \"x", "/b x\n/c \"y(rw)"}) {
    const auto edited = Replace(ExportsDocument(text), "/a", {Entry("h", "")}, ExportPaths());
    EXPECT_EQ(edited.status().code(), kRefusedText) << text;
  }
}

struct FaultCase {
  const char* text;
  const char* place;
  const char* reason;
  bool ends_file;
};

TEST(ExportsDocument, TellsWhereALineIsNotUnderstoodAndWhy) {
  const FaultCase cases[] = {{"# c\n/a x \\\n y\n/b z(rw,foo) w\n", "4:4", "\"foo\"", true},
                             {"/a x \\\n y(rw\n", "2:2", "\")\"", true},
                             {"/a h1(rw) h2(rw, sync) h3(ro)\n", "1:11", "\")\"", true},
                             {"/a x\n\r\n", "2:1", "path", true},
                             {"/a x\n\"/b y(rw)\n/c z\n", "2:1", "quotation mark", true},
                             {"/a x \\\n/b y(rw)\n", "2:1", "backslash", false},
                             {"/a -ro -rw\n", "1:8", "host name", false}};
  for (const FaultCase& c : cases) {
    const ExportsDocument document(c.text);
    std::vector<ExportFault> faults;
    const auto lines = document.Lines();
    for (const ExportLine& line : *lines) {
      if (line.fault) faults.push_back(*line.fault);
    }
    ASSERT_EQ(faults.size(), 1U) << c.text;
    EXPECT_EQ(document.Place(faults[0].position), c.place) << c.text;
    EXPECT_THAT(faults[0].reason, HasSubstr(c.reason)) << c.text;
    EXPECT_EQ(faults[0].ends_file, c.ends_file) << c.text;
  }
}

TEST(ExportsDocument, ReadsTheLinesAfterAFault) {
  const auto lines = ExportsDocument("/b z(rw,foo) w\n/c v\n").Lines();
  ASSERT_EQ(lines->size(), 2U);
  EXPECT_EQ((*lines)[1].path, "/c");
}

TEST(ExportsDocument, ReadsItsLinesOnceForAllWhoOwnThem) {
  const ExportsDocument document("/a x\n");
  const ExportsDocument copy = document;
  auto lines = document.Lines();
  EXPECT_EQ(copy.Lines(), lines);
  const std::weak_ptr<const std::vector<ExportLine>> observed = lines;
  lines.reset();
  EXPECT_TRUE(observed.expired());
  EXPECT_EQ(document.Lines()->size(), 1U);
}

TEST(ExportsDocument, HoldsTenThousandPathsInLinearTime) {
  std::string text;
  for (int i = 0; i < 10000; ++i) text += "/volume1/share" + std::to_string(i) + " 10.0.0.1(rw) 10.0.0.2(ro)\n";
  const ExportsDocument document(text);
  EXPECT_EQ(document.Lines()->size(), 10000U);
  const auto without = Replace(document, "/volume1/share5000", {}, ExportPaths());
  ASSERT_TRUE(without.ok());
  EXPECT_EQ(ExportsDocument(*without).Lines()->size(), 9999U);
}

}  // namespace
}  // namespace vorn
