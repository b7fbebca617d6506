// The translation method "vorn", loaded and asked by libnfsidmap. Its own method "static" is the reference. Generated
// files are compared in idmap_generator_test.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <sstream>
#include <string>
#include <vector>

#include "mapping_table.h"
#include "processes.h"
#include "temporary_root.h"

extern "C" {
#include <sys/types.h>
// Needs the types above, and says nothing of C++ itself.
#include <nfsidmap.h>
}

namespace {

using vorn::Mappings;

constexpr char kConfiguration[] = "/idmapd.conf";
constexpr char kTable[] = "/mappings";

struct Answer {
  int error = 0;
  uid_t user = 0;
  gid_t group = 0;
  int group_error = 0;
  std::vector<gid_t> groups;
};

std::ostream& operator<<(std::ostream& out, const Answer& answer) {
  return out << answer.error << ", user " << answer.user << ":" << answer.group << ", " << answer.group_error << ", "
             << answer.groups.size() << " groups";
}

Answer Ask(std::string principal, int room = 64, std::string mechanism = "krb5") {
  Answer answer;
  answer.error = nfs4_gss_princ_to_ids(mechanism.data(), principal.data(), &answer.user, &answer.group);
  answer.groups.resize(static_cast<std::size_t>(room));
  int count = room;
  answer.group_error = nfs4_gss_princ_to_grouplist(mechanism.data(), principal.data(), answer.groups.data(), &count);
  answer.groups.resize(answer.group_error == 0 ? static_cast<std::size_t>(count) : 0);
  return answer;
}

std::string g_log;

void Log(const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  char line[1024];
  vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  g_log += line;
}

// libnfsidmap loads a method from its own folder; the path leads from there to the build folder.
std::string PluginMethod() { return std::string("../../../../../../../..") + VORN_PLUGIN; }

// The table as Store::Replace writes it: the file at the path is exchanged.
void WriteTable(const TemporaryRoot& root, const std::string& text) {
  root.Write("/new", text);
  ASSERT_EQ(std::rename(root.At("/new").c_str(), root.At(kTable).c_str()), 0);
}

// The library reads its file once per process, and keeps its plug-ins.
void InAnotherProcess(const TemporaryRoot& root, const std::string& methods, const std::function<void()>& body,
                      const std::string& static_section = "") {
  root.Write(kConfiguration, "[General]\nDomain = x\nLocal-Realms = X\n[Translation]\nGSS-Methods = " + methods +
                                 "\n[vorn]\nMappings = " + root.At(kTable) + "\n[Static]\n" + static_section);
  ChildProcess child([&] {
    std::string path = root.At(kConfiguration);
    nfs4_set_debug(0, Log);
    if (nfs4_init_name_mapping(path.data()) != 0) return 2;
    body();
    return testing::Test::HasFailure() ? 1 : 0;
  });
  EXPECT_EQ(child.Wait(), 0);
}

void WithPlugin(const TemporaryRoot& root, const std::function<void()>& body, const std::string& static_section = "") {
  InAnotherProcess(root, PluginMethod() + ",nsswitch", body, static_section);
}

TEST(IDMapPlugin, AnswersLikeTheLibrarysOwnMethod) {
  const Mappings mappings = {{"alice@X", "daemon"}, {"Bob@X", "nobody"}, {"nfs/box@X", "root"}, {"d@X", "bin"}};
  const TemporaryRoot root;
  std::string section;
  for (const auto& [principal, name] : mappings) section.append(principal).append(" = ").append(name).append("\n");
  // The method "static" returns ERANGE where the other methods return -ERANGE.
  const auto ask = [&](const std::string& file) {
    std::string answers;
    for (const char* principal : {"alice@X", "ALICE@x", "bob@X", "nfs/box@X", "d@X", "daemon@X", "none@X", "", "@X"}) {
      std::ostringstream out;
      out << principal << ": " << Ask(principal) << "; no room: " << -std::abs(Ask(principal, 0).group_error)
          << "; another mechanism: " << Ask(principal, 64, "lipkey") << "\n";
      answers += out.str();
    }
    root.Write(file, answers);
  };
  WriteTable(root, vorn::RenderMappingTable(mappings));
  InAnotherProcess(
      root, "static,nsswitch", [&] { ask("/static"); }, section);
  WithPlugin(root, [&] { ask("/plugin"); });
  EXPECT_EQ(root.Read("/plugin"), root.Read("/static"));
  EXPECT_NE(root.Read("/plugin").value_or("").find("ALICE@x: 0, user 1:1"), std::string::npos);
}

// With the method "static" the principal would become the local user of its own name.
TEST(IDMapPlugin, RefusesAPrincipalWhoseUserDoesNotExist) {
  const TemporaryRoot root;
  WriteTable(root, vorn::RenderMappingTable({{"daemon@X", "no-such-user"}}));
  WithPlugin(root, [] {
    EXPECT_EQ(Ask("daemon@X").error, -EACCES);
    EXPECT_EQ(Ask("daemon@X").group_error, -EACCES);
    EXPECT_NE(g_log.find("daemon@X is mapped to the user no-such-user, who does not exist"), std::string::npos);
    EXPECT_EQ(Ask("bin@X").user, 2U) << "other principals are left to the next method";
  });
}

TEST(IDMapPlugin, FollowsTheTableWhileTheDaemonRuns) {
  const TemporaryRoot root;
  WriteTable(root, vorn::RenderMappingTable({{"a@X", "daemon"}}));
  WithPlugin(root, [&] {
    EXPECT_EQ(Ask("a@X").user, 1U);
    WriteTable(root, vorn::RenderMappingTable({{"a@X", "bin"}, {"b@X", "daemon"}}));
    EXPECT_EQ(Ask("a@X").user, 2U);
    EXPECT_EQ(Ask("b@X").user, 1U);
    WriteTable(root, vorn::RenderMappingTable({}));
    EXPECT_EQ(Ask("a@X").error, -ENOENT);
  });
}

// A daemon's idmapd.conf has no mappings that the table has: they must not vanish with the table.
TEST(IDMapPlugin, KeepsATableThatDisappears) {
  const TemporaryRoot root;
  WriteTable(root, vorn::RenderMappingTable({{"daemon@X", "bin"}}));
  WithPlugin(root, [&] {
    std::remove(root.At(kTable).c_str());
    EXPECT_EQ(Ask("daemon@X").user, 2U);
  });
}

TEST(IDMapPlugin, MapsNobodyByADamagedTable) {
  const TemporaryRoot root;
  WriteTable(root, "no table\n");
  WithPlugin(root, [] {
    EXPECT_EQ(Ask("daemon@X").error, -EIO);
    EXPECT_NE(g_log.find("cannot be read"), std::string::npos);
  });
}

TEST(IDMapPlugin, UsesTheMappingsThatTheLibraryHasReadIfThereIsNoTable) {
  const TemporaryRoot root;
  WithPlugin(
      root,
      [] {
        EXPECT_EQ(Ask("daemon@X").user, 2U);
        EXPECT_EQ(Ask("bin@X").error, -EACCES);
        EXPECT_EQ(Ask("sys@X").user, 3U) << "by the next method";
      },
      "Daemon@x = bin\nbin@X = no-such-user\n");
}

}  // namespace
