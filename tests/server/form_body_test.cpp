#include "form_body.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "sandbox.h"

namespace vorn::server {
namespace {

using std::string_literals::operator""s;

std::string Part(const std::string& disposition, const std::string& data) {
  return "--b\r\nContent-Disposition: form-data; " + disposition + "\r\n\r\n" + data + "\r\n";
}

// Returns a form with many files, each of which could keep a descriptor open.
std::string Parts(int count) {
  std::string form;
  for (int i = 0; i < count; ++i) form += Part("name=f" + std::to_string(i) + "; filename=k", "x");
  return form;
}

std::size_t OpenDescriptors() {
  const std::filesystem::directory_iterator entries("/proc/self/fd");
  return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

class FormBodyTest : public testing::Test {
 protected:
  // Returns the status that the form is refused with; 0 if it is accepted.
  int Refusal(const std::string& form) {
    FormBody body("b", *uploads_);
    if (const auto refusal = body.Receive(form)) return refusal->status;
    const auto parameters = body.TakeParameters();
    return std::holds_alternative<Response>(parameters) ? std::get<Response>(parameters).status : 0;
  }

  Sandbox sandbox_;
  std::string error_;
  std::optional<UploadFolder> uploads_ = UploadFolder::Open(sandbox_.File("uploads"), &error_);
};

TEST_F(FormBodyTest, TextsAreParametersAndFilesArePaths) {
  std::string path;
  {
    FormBody body("b", *uploads_);
    const std::string form =
        Part("name=note", "für alice") + Part("name=keytab_file; filename=\"k\"", "\0\1\2"s) + "--b--";
    for (const char c : form) ASSERT_FALSE(body.Receive(std::string_view(&c, 1)));
    const auto taken = body.TakeParameters();
    const auto& parameters = std::get<Json::Value>(taken);
    EXPECT_EQ(parameters.size(), 2U);
    EXPECT_EQ(parameters["note"], "für alice");
    path = parameters["keytab_file_tmp"].asString();
    EXPECT_EQ(path.rfind(sandbox_.File("uploads/"), 0), 0U) << path;
    EXPECT_EQ(ReadWholeFile(path), "\0\1\2"s);
  }
  EXPECT_FALSE(std::filesystem::exists(path)) << "removed with the body";
}

TEST_F(FormBodyTest, AFormIsRefusedWithAReason) {
  const std::string file = "name=keytab_file; filename=k";
  const struct {
    const char* name;
    std::string form;
    int status;
  } cases[] = {
      {"path from outside", Part("name=keytab_file_tmp", "/etc/passwd") + "--b--", 400},
      {"file with a reserved name", Part("name=x_tmp; filename=k", "x") + "--b--", 400},
      {"text twice", Part("name=a", "1") + Part("name=a", "2") + "--b--", 400},
      {"file twice", Part(file, "1") + Part(file, "2") + "--b--", 400},
      {"text with NUL", Part("name=a", "x\0y"s) + "--b--", 400},
      {"text that is no UTF-8", Part("name=a", "\xff") + "--b--", 400},
      {"name that is no UTF-8", Part("name=\"\xff\"", "x") + "--b--", 400},
      {"no end", Part(file, "x"), 400},
      {"nothing", "", 400},
      {"malformed", "--b\r\n\r\n", 400},
      {"large text", Part("name=a", std::string(64 * 1024 + 1, 'x')) + "--b--", 413},
      {"large file", Part(file, std::string(FormCheck::kMaxFileBytes + 1, 'x')) + "--b--", 413},
      {"large preamble", std::string(FormBody::kMaxBytes, 'x') + "\r\n--b--", 413},
      {"the largest text", Part("name=a", std::string(64 * 1024, 'x')) + "--b--", 0},
      {"the largest file", Part(file, std::string(FormCheck::kMaxFileBytes, 'x')) + "--b--", 0},
      {"the largest number of parts", Parts(8) + "--b--", 0},
      {"more parts", Parts(9) + "--b--", 413},
      {"empty file", Part(file, "") + "--b--", 0},
      {"no part", "--b--", 0},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Refusal(c.form), c.status) << c.name;
    EXPECT_TRUE(std::filesystem::is_empty(sandbox_.File("uploads"))) << c.name;
  }
}

TEST_F(FormBodyTest, AFormIsRefusedBeforeItsEnd) {
  const struct {
    const char* name;
    std::string begin;
    int status;
  } cases[] = {{"more parts", Parts(9), 413},
               {"path from outside", Part("name=keytab_file_tmp", "/etc/passwd"), 400},
               {"text twice", Part("name=a", "1") + Part("name=a", "2"), 400},
               {"malformed", "--b\r\n\r\n", 400},
               {"large text", Part("name=a", std::string(64 * 1024 + 100, 'x')), 413}};
  for (const auto& c : cases) {
    FormBody body("b", *uploads_);
    const auto refusal = body.Receive(c.begin);
    ASSERT_TRUE(refusal) << c.name;
    EXPECT_EQ(refusal->status, c.status) << c.name;
  }
}

TEST_F(FormBodyTest, FilesAreMadeWhenTheParametersAreTakenAndAreNotKeptOpen) {
  const std::size_t before = OpenDescriptors();
  FormBody body("b", *uploads_);
  EXPECT_FALSE(body.Receive(Parts(8) + "--b--"));
  EXPECT_TRUE(std::filesystem::is_empty(sandbox_.File("uploads")));
  EXPECT_TRUE(std::holds_alternative<Json::Value>(body.TakeParameters()));
  EXPECT_EQ(body.Uploads().size(), 8U);
  EXPECT_EQ(OpenDescriptors(), before);
}

TEST_F(FormBodyTest, AFileThatCannotBeStoredIsAFailureOfTheServer) {
  std::filesystem::remove(sandbox_.File("uploads"));
  EXPECT_EQ(Refusal(Part("name=keytab_file; filename=k", "x") + "--b--"), 500);
}

}  // namespace
}  // namespace vorn::server
