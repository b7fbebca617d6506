#include "ticket_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace vorn {
namespace {

using testing::IsEmpty;
using testing::SizeIs;

std::string MessageWith(const std::string& reason) {
  return "ERROR: GSS-API: error in handle_nullreq: gss_accept_sec_context(): GSS_S_FAILURE (Unspecified GSS failure.  "
         "Minor code may provide more information) - " +
         reason;
}

std::string Read(const std::string& message) { return ParseTicketMessage(message).value_or("none"); }

// Debian 12 and 13 have the same message.
TEST(TicketMessage, SaysWhyATicketWasRefused) {
  const std::string old = "Request ticket server nfs/box.lab.test@LAB.TEST kvno 2 not found in keytab";
  EXPECT_EQ(Read(MessageWith(old)), old);
  EXPECT_EQ(Read(MessageWith("Clock skew too great\n")), "Clock skew too great");
  EXPECT_EQ(Read(MessageWith("Server (nfs/a) - b) - c")), "Server (nfs/a) - b) - c");
  EXPECT_EQ(Read(MessageWith(std::string(4000, 'x'))), std::string(200, 'x'));
}

TEST(TicketMessage, OfAnotherKindIsIgnored) {
  for (const char* message :
       {"", "WARNING: gss_accept_sec_context failed", "ERROR: GSS-API: error in gss_acquire_cred(): x (y) - z",
        "ERROR: GSS-API: error in handle_nullreq: gss_accept_sec_context(): ",
        "ERROR: GSS-API: error in handle_nullreq: gss_accept_sec_context(): GSS_S_FAILURE (because",
        "ERROR: GSS-API: error in handle_nullreq: gss_accept_sec_context(): GSS_S_FAILURE (because) - ",
        "WARNING: get_ids: failed to map name 'a@LAB.TEST' to uid/gid: Invalid argument"}) {
    EXPECT_EQ(Read(message), "none") << message;
  }
}

TEST(TicketLog, CountsByReasonAndIsBounded) {
  TicketLog log;
  log.Add("Version 2.6.2 starting", 9);
  EXPECT_THAT(log.refused(), IsEmpty());
  log.Add(MessageWith("a"), 8);
  log.Add(MessageWith("a"), 7);
  EXPECT_EQ(log.refused().at("a").count, 2);
  EXPECT_EQ(log.refused().at("a").last, 8);
  for (int i = 0; i < 100; ++i) log.Add(MessageWith(std::to_string(i)), 6);
  EXPECT_THAT(log.refused(), SizeIs(kMostTicketReasons));
  log.Add(MessageWith("a"), 5);
  EXPECT_EQ(log.refused().at("a").count, 3);
}

}  // namespace
}  // namespace vorn
