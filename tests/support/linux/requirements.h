// The requirements of a test program: what it needs of the machine it runs on. A test whose requirement is not met is
// skipped with the reason. In CI (the environment variable CI is "true") a missing program is a failure instead.
#ifndef VORN_TESTS_SUPPORT_LINUX_REQUIREMENTS_H
#define VORN_TESTS_SUPPORT_LINUX_REQUIREMENTS_H

#include <initializer_list>
#include <string>

// Returns "NAME is not installed", or an empty string if the program is on PATH or in a folder of system programs.
std::string ProgramMissing(const std::string& name);

// Returns true if the environment says that this is a run of CI.
bool RunsInCI();

// Both functions skip (or fail) every test of this test program if the requirement is not met. Call them before
// RUN_ALL_TESTS(), for example from the initializer of a global variable. They always return true.
bool RequirePrograms(std::initializer_list<const char*> names);
bool RequirePrivateNamespaces();

#endif  // VORN_TESTS_SUPPORT_LINUX_REQUIREMENTS_H
