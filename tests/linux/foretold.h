// Compares what a rehearsal says with what the change then does.
#ifndef VORN_TESTS_LINUX_FORETOLD_H
#define VORN_TESTS_LINUX_FORETOLD_H

#include <functional>
#include <string>
#include <vector>

#include "temporary_root.h"

// An operation on the box. Returns its outcome, for example its result as text.
using Operation = std::function<std::string()>;

// Rehearses the operation and then carries it out, each in a call context with these uploads. Expects that the
// rehearsal changes nothing below the root, not even a timestamp, and foretells the outcome, the reasons and warnings,
// and the difference of each file. Returns the outcome.
//
// The operation may remove its uploads, also in the rehearsal; they are then written again. Locks, and the enabled
// state of the engine of a trial root, which is a file, are not compared.
std::string ExpectForetold(const TemporaryRoot& root, const Operation& operation,
                           const std::vector<std::string>& uploads = {});

// The same for an operation of the contract, which returns a number. The outcome of a failure has the error's code.
int ExpectForetold(const TemporaryRoot& root, const std::function<int()>& operation,
                   const std::vector<std::string>& uploads = {});

#endif  // VORN_TESTS_LINUX_FORETOLD_H
