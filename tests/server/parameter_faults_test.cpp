// The schemas of the NFS module, as the server evaluates them, against all requests of the module's tests: each request
// that was refused with 2301 has a faulty parameter, and no accepted request has one.
#include <gtest/gtest.h>
#include <json/reader.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

#include "descriptor.h"
#include "sandbox.h"

namespace vorn::server {
namespace {

struct Counts {
  int accepted = 0;
  int refused = 0;
};

// Checks one line of recorded_answers.h.
void Check(const Descriptor& descriptor, const std::string& line, Counts* counts) {
  Json::Value answer;
  std::istringstream(line) >> answer;  // the tests also try U+0000, which the server's own reader refuses
  Json::Value request = answer["request"];
  if (request.isNull()) request = Json::objectValue;
  const auto faults = descriptor.ParameterFaults("/api/" + answer["method"].asString(), request);
  const int code = answer["code"].asInt();
  if (code == 2301) {
    EXPECT_FALSE(faults.empty()) << line;
    ++counts->refused;
  }
  // A platform without Kerberos ignores the security flavours.
  if (code == 0 && answer["kerberos"].asBool()) {
    EXPECT_TRUE(faults.empty()) << faults.front() << ": " << line;
    ++counts->accepted;
  }
}

TEST(ParameterFaults, AreFoundInTheRefusedRequestsOnly) {
  std::string error;
  const auto descriptor = Descriptor::Parse(ReadWholeFile(NFS_DESCRIPTOR), &error);
  ASSERT_TRUE(descriptor) << error;
  Counts counts;
  for (const auto& file : std::filesystem::directory_iterator(RECORDED_ANSWERS)) {
    std::ifstream lines(file.path());
    for (std::string line; std::getline(lines, line);) Check(*descriptor, line, &counts);
  }
  EXPECT_GT(counts.refused, 100);
  EXPECT_GT(counts.accepted, 100);
}

}  // namespace
}  // namespace vorn::server
