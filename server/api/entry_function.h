// Runs the entry function of a module, and makes the HTTP answer of what it reports.
#ifndef VORN_SERVER_ENTRY_FUNCTION_H
#define VORN_SERVER_ENTRY_FUNCTION_H

#include <json/value.h>

#include <memory>
#include <optional>
#include <string>

#include "answer.h"
#include "call.h"
#include "routes.h"

namespace vorn::server {

// The report of an entry function.
struct Outcome {
  int code() const { return response->error(); }                // the error code; 0 for success
  const Json::Value& data() const { return response->data(); }  // the result, or the details of the error

  std::unique_ptr<const VORN::APIResponse> response;  // never null; owned, because a copy of its data may be large
  Remarks remarks;
};

// Runs the entry function in this thread, in a call context of this description. Throws what the entry function throws,
// and std::runtime_error if it does not answer.
Outcome RunEntryFunction(const Route& route, Json::Value parameters, VORN::CallDescription description);

// The answer of `route` to a call. The error code's status and text are those of the descriptor.
Response AnswerTo(const Route& route, const Outcome& outcome);

// Like RunEntryFunction and AnswerTo. The answer of a successful reading method has an entity tag.
Response RunAndAnswer(const Route& route, Json::Value parameters, VORN::CallDescription description);

// Runs a changing method only if `if_match`, the value of an If-Match header, names the present answer of the method
// that shows what it changes (Route::shown_by, which must not be null). Otherwise the answer has status 412, and the
// present data and its entity tag. Nothing can change between the comparison and the change, except by an editor,
// whose change the platform detects and refuses to overwrite.
Response RunIfUnchanged(const Route& route, Json::Value parameters, VORN::CallDescription description,
                        std::string_view if_match);

// Rehearses a changing method: answers what RunAndAnswer, or with a condition RunIfUnchanged, would answer, and what
// the call would have changed. Nothing is changed, and no lock is taken: the reading method and the changing one work
// on one draft. `sees_all`: the caller may see unchanged lines of files and the findings that the change would add or
// remove, which may be about any shared folder.
Response Rehearse(const Route& route, Json::Value parameters, VORN::CallDescription description,
                  const std::optional<std::string>& if_match, bool sees_all);

}  // namespace vorn::server

#endif  // VORN_SERVER_ENTRY_FUNCTION_H
