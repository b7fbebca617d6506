// The time of calls over unusual files and of unusual calls: each file or call has parts of one shape that a reader
// could look through again for each of them. Each is measured beside the same with a tenth of the parts (the floor). A
// ratio of 10 to 13 is growth with their number, or with its product with its logarithm; caches that are too small add
// to it, and 100 is growth with its square.
#include <benchmark/benchmark.h>

#include <filesystem>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "entry_functions.h"
#include "temporary_root.h"

namespace {

constexpr long kParts = 20'000;

// A file of `count` lines, each made of a number.
struct Shape {
  std::string name;
  std::string path;
  std::string head;
  std::function<std::string(const std::string& number)> line;
  std::string tail;
};

struct Call {
  std::string name;
  Entry entry;
  std::function<Json::Value(long count)> params;
};

Call Fixed(const std::string& name, Entry entry, const Json::Value& params) {
  return {name, entry, [params](long /*count*/) { return params; }};
}

std::string TextOf(const Shape& shape, long count) {
  std::string text = shape.head;
  for (long i = 0; i < count; ++i) text += shape.line(std::to_string(i));
  return text + shape.tail;
}

constexpr const char* kUsers = "root:x:0:0::/:/bin/sh\nadmin:x:1024:100::/:/bin/sh\nuser:x:1025:100::/:/bin/sh\n";
constexpr const char* kShares = "[shares]\ndata = /volume1/data\n";

// The box of all measurements: the process remembers each box that it has seen.
const TemporaryRoot& UsualBox() {
  static const TemporaryRoot root;
  for (const char* folder : {"/etc", "/var", "/run"}) std::filesystem::remove_all(root.At(folder));
  root.Write("/etc/exports", "/volume1/data 10.0.0.1(rw)\n");
  root.Write("/etc/idmapd.conf", "[General]\nDomain = box.example\n");
  root.Write("/etc/nfs.conf", "");
  root.Write("/etc/passwd", kUsers);
  root.Write("/etc/login.defs", "");
  root.Write("/etc/nfs/krb5.conf", "[libdefaults]\ndefault_realm = BOX.EXAMPLE\n");
  root.Write("/etc/vorn/shares.conf", kShares);
  root.Write("/volume1/data/.keep", "");
  return root;
}

// Before each round the call is made with the usual files, so that nothing is known from the round before.
void Measure(benchmark::State& state, const Shape& shape, const Call& call, long count) {
  for (auto round : state) {
    state.PauseTiming();
    const TemporaryRoot& box = UsualBox();
    VORN::APIRequest usual(call.params(1));
    VORN::APIResponse usual_response;
    call.entry(&usual, &usual_response);
    box.Write(shape.path, TextOf(shape, count));
    VORN::APIRequest request(call.params(count));
    VORN::APIResponse response;
    state.ResumeTiming();
    call.entry(&request, &response);
  }
}

std::vector<Shape> ExportsShapes() {
  const std::string path = "/etc/exports";
  const std::string own = "/volume1/data 10.0.0.1(rw)\n";
  using S = const std::string&;
  return {{"lines of one share", path, "", [](S n) { return "/volume1/data h" + n + "(rw)\n"; }, ""},
          {"one line of a share", path, "/volume1/data", [](S n) { return " h" + n + "(rw)"; }, "\n"},
          {"one client", path, "/volume1/data", [](S) { return std::string(" h(rw)"); }, "\n"},
          {"options of one client", path, "/volume1/data h(rw", [](S) { return std::string(",insecure"); }, ")\n"},
          {"default options", path, "/volume1/data", [](S) { return std::string(" -ro h"); }, "\n"},
          {"lines with default options only", path, own, [](S n) { return "/v" + n + " -ro\n"; }, ""},
          {"continued lines", path, own, [](S) { return std::string("\\\n"); }, "\n"},
          {"comments", path, own, [](S n) { return "# " + n + "\n"; }, ""},
          {"lines of blanks", path, own, [](S) { return std::string(" \n"); }, ""},
          {"quoted paths", path, own, [](S n) { return "\"/v " + n + "\" h(rw)\n"; }, ""},
          {"escaped paths", path, own, [](S n) { return "/v\\040" + n + " h(rw)\n"; }, ""},
          {"spellings of one path", path, own, [](S) { return std::string("//volume1/./data h(rw)\n"); }, ""},
          {"folders", path, own, [](S n) { return "/v" + n + "/data h(rw)\n"; }, ""},
          {"one deep path", path, own + "/v", [](S) { return std::string("/a"); }, " h(rw)\n"},
          {"faulty lines", path, own, [](S n) { return "/v" + n + " h(foo)\n"; }, ""},
          {"open quotation", path, own + "\"/v", [](S n) { return n + "\n"; }, ""}};
}

std::vector<Shape> IdMapShapes() {
  const std::string path = "/etc/idmapd.conf";
  const std::string head = "[General]\nDomain = box.example\n[Static]\n";
  using S = const std::string&;
  return {
      {"mappings", path, head, [](S n) { return "p" + n + "@BOX.EXAMPLE = user\n"; }, ""},
      {"mappings of one principal", path, head, [](S) { return std::string("p@BOX.EXAMPLE = user\n"); }, ""},
      {"a principal without a user", path, head, [](S) { return std::string("p@BOX.EXAMPLE =\n"); }, ""},
      {"principals without a user", path, head, [](S n) { return "p" + n + "@BOX.EXAMPLE =\n"; }, ""},
      {"malformed principals", path, head, [](S n) { return "p" + n + "\xff@BOX.EXAMPLE = user\n"; }, ""},
      {"principals that look the same", path, head,
       [](S n) { return "p" + std::string(n.size() % 7 + 1, '\xff') + n.substr(0, 2) + "\xfe" + n + "= user\n"; }, ""},
      {"one section, many headers", path, head, [](S n) { return "[Static]\np" + n + " = user\n"; }, ""},
      {"sections", path, head, [](S n) { return "[s" + n + "]\np = user\n"; }, ""},
      {"sections with arguments", path, head, [](S n) { return "[Static \"" + n + "\"]\np = user\n"; }, ""},
      {"references", path, head, [](S n) { return "p" + n + " = $v" + n + "\n"; }, ""},
      {"a chain of references", path, "[environment]\n",
       [](S n) { return "v" + n + " = $v" + std::to_string(std::stol(n) + 1) + "\n"; }, "[Static]\np = $v0\n"},
      {"references to a chain", path, "[environment]\na = $b\nb = $c\nc = user\n[Static]\n",
       [](S n) { return "p" + n + " = $a\n"; }, ""},
      {"malformed headers", path, head, [](S n) { return "[s" + n + "\n"; }, ""},
      {"continued lines", path, head, [](S) { return std::string("\\\n"); }, "p = user\n"},
      {"one long line", path, head + "p = ", [](S) { return std::string("user "); }, "\n"},
      {"quotation marks", path, head + "p = ", [](S) { return std::string("\""); }, "\n"},
      {"include lines", path, "", [](S n) { return "include = -absent" + n + "\n"; }, ""},
      {"include lines of one file", path, "", [](S) { return std::string("include = -absent\n"); }, ""}};
}

std::vector<Shape> NfsConfShapes() {
  std::vector<Shape> shapes = IdMapShapes();
  for (Shape& shape : shapes) shape.path = "/etc/nfs.conf";
  return shapes;
}

std::vector<Shape> UserShapes() {
  using S = const std::string&;
  return {{"users", "/etc/passwd", kUsers, [](S n) { return "u" + n + ":x:" + n + ":1::/:/bin/sh\n"; }, ""},
          {"one user", "/etc/passwd", kUsers, [](S) { return std::string("u:x:5000:1::/:/bin/sh\n"); }, ""},
          {"one number", "/etc/passwd", kUsers, [](S n) { return "u" + n + ":x:5000:1::/:/bin/sh\n"; }, ""},
          {"lines that are no users", "/etc/passwd", kUsers, [](S n) { return "u" + n + "\n"; }, ""},
          {"shares", "/etc/vorn/shares.conf", kShares, [](S n) { return "s" + n + " = /volume1/s" + n + "\n"; }, ""},
          {"shares of one folder", "/etc/vorn/shares.conf", kShares, [](S n) { return "s" + n + " = /volume1/data\n"; },
           ""},
          // libkrb5 parses its file, in a time that grows with the square of the lines.
          {"realms", "/etc/nfs/krb5.conf", "[libdefaults]\n", [](S n) { return "default_realm = R" + n + "\n"; }, ""},
          {"limits of user numbers", "/etc/login.defs", "", [](S n) { return "UID_MIN " + n + "\n"; }, ""}};
}

Json::Value One(const std::string& key, Json::Value value) {
  Json::Value params;
  params[key] = std::move(value);
  return params;
}

// Parameters whose list `key` has `count` items.
Json::Value Repeated(const std::string& key, long count, const std::function<Json::Value(const std::string&)>& item) {
  Json::Value params;
  for (long i = 0; i < count; ++i) params[key].append(item(std::to_string(i)));
  return params;
}

Json::Value RuleOf(const std::string& client) {
  Json::Value rule;
  rule["client"] = client;
  rule["privilege"] = "rw";
  rule["root_squash"] = "root";
  for (const char* key : {"async", "insecure", "crossmnt"}) rule[key] = false;
  for (const char* key : {"sys", "kerberos", "kerberos_integrity", "kerberos_privacy"}) {
    rule["security_flavor"][key] = std::string(key) == "sys";
  }
  return rule;
}

Call Save(const std::string& name, const std::function<std::string(const std::string&)>& client, bool is_one = false) {
  return {name, NFSSharePrivilegeSet, [client, is_one](long count) {
            Json::Value params =
                Repeated("rule", is_one ? 1 : count, [&](const std::string& n) { return RuleOf(client(n)); });
            params["share_name"] = "data";
            return params;
          }};
}

Json::Value MappingOf(const std::string& principal) {
  Json::Value mapping;
  mapping["kerberos_principal"] = principal;
  mapping["local_name"] = "user";
  return mapping;
}

Call Create(const std::string& name, const std::function<std::string(const std::string&)>& principal,
            bool is_one = false) {
  return {name, NFSIDMapCreate, [principal, is_one](long count) {
            return Repeated("idmap", is_one ? 1 : count, [&](const std::string& n) { return MappingOf(principal(n)); });
          }};
}

Json::Value PageOf50() {
  Json::Value params;
  params["limit"] = 50;
  return params;
}

Json::Value Suggestions() {
  Json::Value params = PageOf50();
  params["suggestion"] = true;
  return params;
}

Json::Value NewDomain() {
  Json::Value params = One("enable_nfs", false);
  params["enable_nfs_v4"] = true;
  params["nfs_v4_domain"] = "new.example";
  params["read_size"] = 16384;
  return params;
}

void Register(const std::string& file, const std::vector<Shape>& shapes, const std::vector<Call>& calls) {
  for (const Shape& shape : shapes) {
    for (const Call& call : calls) {
      const std::string name = file + ", " + shape.name + ": " + call.name;
      const auto add = [&](const std::string& full, long count) {
        benchmark::RegisterBenchmark(full.c_str(), Measure, shape, call, count)
            ->Unit(benchmark::kMicrosecond)
            ->Iterations(1)
            ->Repetitions(3);
      };
      add(name, kParts);
      add(name + "/floor", kParts / 10);
    }
  }
}

}  // namespace

int main(int argc, char** argv) {
  using S = const std::string&;
  const Call save_new = Save(
      "save", [](S) { return std::string("new.example"); }, true);
  const Call create_new = Create(
      "create", [](S) { return std::string("new@BOX.EXAMPLE"); }, true);
  const std::vector<Call> rules = {Fixed("load", NFSSharePrivilegeGet, One("share_name", "data")), save_new,
                                   Save(
                                       "remove", [](S) { return std::string("10.0.0.1"); }, true)};
  const std::vector<Call> mappings = {Fixed("page", NFSIDMapList, PageOf50()), create_new,
                                      Fixed("remove", NFSIDMapDelete, One("id", "p@BOX.EXAMPLE"))};
  const std::vector<Call> settings = {Fixed("get", NFSGet, Json::Value(Json::objectValue)),
                                      Fixed("set", NFSSet, NewDomain())};
  const std::vector<Call> users = {Fixed("suggestions", NFSIDMapList, Suggestions()), create_new, save_new};
  const std::vector<Call> requests = {
      Save("rules for hosts", [](S n) { return "h" + n + ".example"; }),
      Save("rules for addresses",
           [](S n) { return "10." + std::to_string(std::stol(n) / 250) + ".1." + std::to_string(std::stol(n) % 250); }),
      Save("rules for networks",
           [](S n) { return "2001:db8:" + n.substr(0, 4) + ":" + n.substr(n.size() / 2) + "::/64"; }),
      Save("rules for patterns", [](S n) { return "*" + n + ".example"; }),
      Save("rules for one host", [](S) { return std::string("h"); }),
      Create("new mappings", [](S n) { return "n" + n + "@BOX.EXAMPLE"; }),
      Create("one new mapping", [](S) { return std::string("n@BOX.EXAMPLE"); }),
      Create("existing mappings", [](S n) { return "p" + n + "@BOX.EXAMPLE"; }),
      {"removed mappings", NFSIDMapDelete,
       [](long count) { return Repeated("id", count, [](S n) { return Json::Value("p" + n + "@BOX.EXAMPLE"); }); }},
      {"a removed mapping", NFSIDMapDelete,
       [](long count) { return Repeated("id", count, [](S) { return Json::Value("p1@BOX.EXAMPLE"); }); }},
      {"other members", NFSSet, [](long count) {
         Json::Value params = NewDomain();
         for (long i = 0; i < count; ++i) params["other" + std::to_string(i)] = true;
         return params;
       }}};
  Register("exports", ExportsShapes(), rules);
  Register("idmapd.conf", IdMapShapes(), mappings);
  Register("nfs.conf", NfsConfShapes(), settings);
  Register("others", UserShapes(), users);
  Register("requests", {IdMapShapes().front()}, requests);
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
}
