#include "recorded_answers.h"

#include <json/writer.h>

#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <string>

#include "fake_platform.h"

namespace {

// Opens the file of this program, which is empty at the program's first line.
std::ofstream* OpenFile() {
  const char* const folder = std::getenv("VORN_RECORD_ANSWERS");
  if (folder == nullptr) return nullptr;
  return new std::ofstream(std::string(folder) + "/" + program_invocation_short_name + ".jsonl");
}

}  // namespace

void RecordAnswer(EntryFunction entry, const Json::Value& params, const Answer& answer) {
  static std::ofstream* const file = OpenFile();  // not destroyed: tests end with the process
  const APIRow* const row = RowOf(entry);
  if (file == nullptr || row == nullptr) return;
  Json::Value line;
  line["method"] = std::string(row->api) + "/v" + std::to_string(row->version) + "/" + row->method;
  line["request"] = params;
  line["code"] = answer.code;
  line["data"] = answer.data;
  line["kerberos"] = FakePlatform::Current().kerberos_support != 0;
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  *file << Json::writeString(builder, line) << std::endl;
}
