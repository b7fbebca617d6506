// Records the answers of the module, so that they can be compared with its descriptor after the tests.
#ifndef VORN_TESTS_SUPPORT_RECORDED_ANSWERS_H
#define VORN_TESTS_SUPPORT_RECORDED_ANSWERS_H

#include <json/value.h>

#include "module_table.h"

struct Answer;

// Appends a line of JSON to PROGRAM.jsonl in the folder that the environment variable VORN_RECORD_ANSWERS names:
//     {"method": "API/v1/name", "request": {...}, "code": 0, "data": ..., "kerberos": true}
// "kerberos" says whether the platform supports Kerberos. Does nothing if the variable is not set, or if `entry` is not
// an entry function of the module.
void RecordAnswer(EntryFunction entry, const Json::Value& params, const Answer& answer);

#endif  // VORN_TESTS_SUPPORT_RECORDED_ANSWERS_H
