#include "recorded_answers.h"

#include <json/writer.h>

#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <string>

#include "fake_platform.h"

// The table of the module, if the test program is linked with the module.
extern "C" __attribute__((weak)) const void* GetAPITable();

namespace {

// Returns the row of an entry function, or nullptr for any other function.
const APIRow* RowOf(EntryFunction entry) {
  if (GetAPITable == nullptr) return nullptr;
  for (const auto* row = static_cast<const APIRow*>(GetAPITable()); row->api != nullptr; ++row) {
    if (row->handler == entry) return row;
  }
  return nullptr;
}

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
