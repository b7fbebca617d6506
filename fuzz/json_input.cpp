// The parameters of a request. Parameters that are accepted stay equal when they are written and read again.
#include "json_input.h"

#include <json/writer.h>

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  std::string error;
  const auto value = vorn::server::ParseJsonObject(text, &error);
  if (value.has_value() != error.empty()) std::abort();
  if (!value) return 0;
  const auto again = vorn::server::ParseJsonObject(Json::writeString(Json::StreamWriterBuilder(), *value), &error);
  if (!again || *again != *value) std::abort();
  return 0;
}
