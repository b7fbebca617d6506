#include "served_exports.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

using Entries = std::vector<KernelCache::Entry>;

TEST(ServedExports, KnowTheRuleOfAnAddressAndWhoHasNone) {
  const Entries addresses = {{{"nfsd", "10.9.0.11", "10.9.0.11,10.9.0.0/24"}, false},
                             {{"nfsd", "fd00:0009:0000:0000:0000:0000:0000:000b", "*"}, true},  // expired
                             {{"nfsd", "10.9.0.12", "-no-domain-"}, true},
                             {{"other", "10.9.0.13", "*"}, false},
                             {{"nfsd", "nonsense", "*"}, false},
                             {{"nfsd"}, false}};
  const ServedExports served = ReadServedExports(addresses, {});
  EXPECT_THAT(served.rules, ElementsAre(Pair("10.9.0.11", "10.9.0.11,10.9.0.0/24"), Pair("fd00:9::b", "*")));
  EXPECT_THAT(served.refused, ElementsAre("10.9.0.12"));
}

TEST(ServedExports, HaveTheExportsInUseWithoutTheWayToThem) {
  const Entries rights = {{{"/", "*(ro,v4root,fsid=0,sec=1)"}, false},
                          {{"/srv/a\\040b", "*(rw,sec=1)"}, false},
                          {{"/srv/old", "*(rw)"}, true},
                          {{"/srv/none", "*()"}, true},
                          {{"/srv/(odd", "10.0.0.1"}, false},
                          {{"/srv"}, false}};
  const ServedExports served = ReadServedExports({}, rights);
  EXPECT_THAT(served.paths, ElementsAre(Pair("*", ElementsAre("/srv/a b", "/srv/old"))));
  EXPECT_THAT(served.unserved, ElementsAre(Pair("*", ElementsAre("/srv/none"))));
}

// The format of Linux 6.1.
TEST(ExportTraffics, AreByPathAndRule) {
  const ExportTraffics traffics = ParseExportTraffics(
      "# Version 1.1\n# Path Client Start-time\n#\tStats\n"
      "/srv/a\\040b\t10.9.0.0/24\t65\n\tfh_stale: 0\n\tio_read: 1\n\tio_write: 2\n\n"
      "/srv/data\t*\t67\n\tfh_stale: 0\n\tio_read: 3\n\tio_write: 18446744073709551615\n\n");
  ASSERT_EQ(traffics.size(), 2U);
  const ExportTraffic& first = traffics.at({"/srv/a b", "10.9.0.0/24"});
  EXPECT_EQ(first.bytes_read, 1U);
  EXPECT_EQ(first.bytes_written, 2U);
  EXPECT_EQ(first.begun, 65);
  EXPECT_EQ(traffics.at({"/srv/data", "*"}).bytes_written, UINT64_MAX);
}

TEST(ExportTraffics, IgnoreWhatIsIncomplete) {
  for (const char* text : {"", "\tio_read: 1\n\tio_write: 2\n", "/srv\t*\n\tio_read: 1\n\tio_write: 2\n",
                           "/srv\t*\tnow\n\tio_read: 1\n\tio_write: 2\n", "/srv\t*\t1\n\tio_read: 1\n",
                           "/srv\t*\t1\n\tio_read: -1\n\tio_write: 2\n", "/srv\t*\t1\n\tio_write: 2\n"}) {
    EXPECT_THAT(ParseExportTraffics(text), IsEmpty()) << text;
  }
}

}  // namespace
}  // namespace vorn
