// The JSON form of a rehearsal. "schemas/Rehearsal" of openapi.json describes it.
#ifndef VORN_SERVER_REHEARSAL_ANSWER_H
#define VORN_SERVER_REHEARSAL_ANSWER_H

#include <json/value.h>

#include "rehearsal.h"

namespace vorn::server {

// {"files": [...], "actions": [...], "rules": [...]}
Json::Value RehearsalJson(const VORN::Rehearsal& rehearsal);

// {"added": [...], "removed": [...]}
Json::Value FindingsJson(const VORN::Rehearsal::Findings& findings);

}  // namespace vorn::server

#endif  // VORN_SERVER_REHEARSAL_ANSWER_H
