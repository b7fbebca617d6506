// The parameters of a request, read one by one.
#ifndef VORN_SRC_PARAMETER_READER_H
#define VORN_SRC_PARAMETER_READER_H

#include <json/value.h>

#include <algorithm>
#include <climits>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <string>
#include <vector>

#include "handler.h"

// Reads the parameters of one request. A parameter that is missing although it is needed, has the wrong JSON type or a
// value that is not accepted makes ok() false; the first one is logged for the call site of the reader. A null value
// counts as absent. Not thread-safe. The parameters must outlive the reader.
class ParameterReader {
 public:
  ParameterReader(const CallSite& site, const Json::Value& params) : site_(site), params_(params) {}

  // Whether all parameters that were read are accepted.
  bool ok() const { return ok_; }

  // A string without NUL bytes; "" if it is absent.
  std::string Text(const char* name);

  // A string without NUL bytes that is not empty.
  std::string NeededText(const char* name);

  // Strings without NUL bytes that are not empty; none if the parameter is absent.
  std::vector<std::string> Texts(const char* name);

  // One of `words`; `fallback` if the parameter is absent.
  template <std::size_t kSize>
  std::string Word(const char* name, const char* fallback, const char* const (&words)[kSize]) {
    if (params_[name].isNull()) return fallback;
    const std::string word = Text(name);
    return std::find(std::begin(words), std::end(words), word) != std::end(words) ? word : Refuse(name);
  }

  // An integer from `least` to `most`; `fallback` if the parameter is absent.
  std::int64_t Integer(const char* name, std::int64_t fallback, std::int64_t least, std::int64_t most);

  // An integer of any size; `fallback` if the parameter is absent.
  int Integer(const char* name, int fallback) { return static_cast<int>(Integer(name, fallback, INT_MIN, INT_MAX)); }

 private:
  std::string Refuse(const char* name);

  CallSite site_;
  const Json::Value& params_;
  bool ok_ = true;
};

#endif  // VORN_SRC_PARAMETER_READER_H
