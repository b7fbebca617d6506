#include "parameter_reader.h"

#include <optional>
#include <string_view>

#include "json_text.h"
#include "log.h"

namespace {

std::optional<std::string> PlainText(const Json::Value& value) {
  const std::optional<std::string_view> text = TextOf(value);
  if (!text || text->find('\0') != std::string_view::npos) return std::nullopt;
  return std::string(*text);
}

}  // namespace

std::string ParameterReader::Text(const char* name) {
  if (params_[name].isNull()) return "";
  const std::optional<std::string> text = PlainText(params_[name]);
  return text ? *text : Refuse(name);
}

std::string ParameterReader::NeededText(const char* name) {
  const std::optional<std::string> text = PlainText(params_[name]);
  return text && !text->empty() ? *text : Refuse(name);
}

std::vector<std::string> ParameterReader::Texts(const char* name) {
  const Json::Value& values = params_[name];
  std::vector<std::string> texts;
  if (values.isNull()) return texts;
  if (!values.isArray()) {
    Refuse(name);
    return texts;
  }
  for (const Json::Value& value : values) {
    const std::optional<std::string> text = PlainText(value);
    texts.push_back(text && !text->empty() ? *text : Refuse(name));
  }
  return texts;
}

std::int64_t ParameterReader::Integer(const char* name, std::int64_t fallback, std::int64_t least, std::int64_t most) {
  const Json::Value& value = params_[name];
  if (value.isNull()) return fallback;
  if (value.isInt64() && value.asInt64() >= least && value.asInt64() <= most) return value.asInt64();
  Refuse(name);
  return fallback;
}

std::string ParameterReader::Refuse(const char* name) {
  if (ok_) LOG_ERROR_AT(site_, "variable '%s' is missing or not accepted.", name);
  ok_ = false;
  return "";
}
