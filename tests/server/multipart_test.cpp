#include "multipart.h"

#include <gmock/gmock.h>

#include <vector>

namespace vorn::server {
namespace {

using testing::ElementsAre;

// Records the events: "name:", "name@" for a file, the data, ";".
class Recorder : public PartReceiver {
 public:
  bool BeginPart(const PartHead& head) override {
    parts.push_back(head.name + (head.is_file ? "@" : ":"));
    return head.name != "unwanted";
  }
  bool PartData(std::string_view data) override {
    parts.back() += data;
    return data.find('!') == std::string_view::npos;
  }
  bool EndPart() override {
    parts.back() += ';';
    return true;
  }
  std::vector<std::string> parts;
};

struct Outcome {
  std::vector<std::string> parts;
  bool complete;
  std::string error;
};

// Parses the text in two pieces, split at `split`.
Outcome Parse(const std::string& text, std::size_t split) {
  Recorder recorder;
  MultipartParser parser("xYz", recorder);
  if (parser.Feed(std::string_view(text).substr(0, split))) parser.Feed(std::string_view(text).substr(split));
  return {recorder.parts, parser.complete(), parser.error()};
}

const std::string kForm =
    "preamble\r\n--xYz \t\r\ncontent-disposition: form-data; name=\"a\"\r\n\r\none\r\n--xY\r\n--x\r\n"
    "--xYz\r\nContent-Type: application/octet-stream\r\nContent-Disposition: form-data; name=b\r\n\r\n\r\n"
    "--xYz\r\nContent-Disposition: form-data; name=c; filename=\"\"\r\nX: y\r\n\r\n\r\n\r\n--\r\n"
    "--xYz--epilogue\r\n--xYz\r\n";

TEST(Multipart, IsReadAlikeHoweverItIsSplit) {
  for (std::size_t split = 0; split <= kForm.size(); ++split) {
    const Outcome outcome = Parse(kForm, split);
    EXPECT_THAT(outcome.parts, ElementsAre("a:one\r\n--xY\r\n--x;", "b@;", "c@\r\n\r\n--;")) << split;
    EXPECT_TRUE(outcome.complete) << split;
  }
}

TEST(Multipart, IsReadAlikeByteByByte) {
  Recorder recorder;
  MultipartParser parser("xYz", recorder);
  for (const char c : kForm) ASSERT_TRUE(parser.Feed(std::string_view(&c, 1)));
  EXPECT_THAT(recorder.parts, ElementsAre("a:one\r\n--xY\r\n--x;", "b@;", "c@\r\n\r\n--;"));
  EXPECT_TRUE(parser.complete());
}

TEST(Multipart, IsCompleteAtItsClosingBoundaryAlone) {
  const std::size_t closed = kForm.find("--xYz--") + 7;
  for (std::size_t size = 0; size <= kForm.size(); ++size) {
    EXPECT_EQ(Parse(kForm.substr(0, size), size).complete, size >= closed) << size;
  }
}

TEST(Multipart, WithoutPartsIsEmpty) {
  EXPECT_TRUE(Parse("--xYz--", 3).complete);
  EXPECT_THAT(Parse("--xYz--", 3).parts, ElementsAre());
}

TEST(Multipart, IsRefusedWhenMalformed) {
  const std::string head = "Content-Disposition: form-data; name=a\r\n";
  const struct {
    const char* name;
    std::string text;
  } cases[] = {
      {"no head", "--xYz\r\n\r\nx"},
      {"no name", "--xYz\r\nContent-Disposition: form-data\r\n\r\nx"},
      {"empty name", "--xYz\r\nContent-Disposition: form-data; name=\"\"\r\n\r\nx"},
      {"no disposition", "--xYz\r\nContent-Type: text/plain\r\n\r\nx"},
      {"two dispositions", "--xYz\r\n" + head + head + "\r\nx"},
      {"another disposition", "--xYz\r\nContent-Disposition: attachment; name=a\r\n\r\nx"},
      {"broken disposition", "--xYz\r\nContent-Disposition: form-data; name=\"a\r\n\r\nx"},
      {"line without a colon", "--xYz\r\n" + head + "nonsense\r\n\r\nx"},
      {"something behind the boundary", "--xYzz\r\n" + head + "\r\nx"},
      {"endless head", "--xYz\r\n" + head + "X: " + std::string(MultipartParser::kMaxHeadBytes, 'x')},
      {"endless boundary line", "--xYz" + std::string(2 * MultipartParser::kMaxHeadBytes, ' ')},
  };
  for (const auto& c : cases) {
    for (const std::size_t split : {std::size_t{0}, c.text.size() / 2, c.text.size() - 1}) {
      EXPECT_NE(Parse(c.text, split).error, "") << c.name;
      EXPECT_FALSE(Parse(c.text, split).complete) << c.name;
    }
  }
}

TEST(Multipart, StopsWhenTheReceiverSaysSo) {
  for (const char* text : {"--xYz\r\nContent-Disposition: form-data; name=unwanted\r\n\r\nx\r\n--xYz--",
                           "--xYz\r\nContent-Disposition: form-data; name=a\r\n\r\n!\r\n--xYz--"}) {
    Recorder recorder;
    MultipartParser parser("xYz", recorder);
    EXPECT_FALSE(parser.Feed(text));
    EXPECT_FALSE(parser.Feed("more"));
    EXPECT_EQ(parser.error(), "");
    EXPECT_FALSE(parser.complete());
  }
}

TEST(Multipart, KnowsWhatABoundaryIs) {
  EXPECT_TRUE(MultipartParser::IsBoundary("----WebKitFormBoundary7MA4YWxk"));
  EXPECT_TRUE(MultipartParser::IsBoundary(std::string(70, 'a')));
  for (const std::string& text :
       {std::string(), std::string(71, 'a'), std::string("a "), std::string("a\"b"), std::string("a\r\n")}) {
    EXPECT_FALSE(MultipartParser::IsBoundary(text)) << text;
  }
}

}  // namespace
}  // namespace vorn::server
