// Where the files are that belong to this program: in the build tree, or in an installation.
#ifndef VORN_SERVER_PROGRAM_FOLDERS_H
#define VORN_SERVER_PROGRAM_FOLDERS_H

#include <string>

namespace vorn::server {

// The folder of the modules that are loaded by default.
std::string DefaultModuleFolder();

// The folder of the console's files.
std::string ConsoleFolder();

// The path of the program that checks passwords.
std::string PasswordHelperPath();

}  // namespace vorn::server

#endif  // VORN_SERVER_PROGRAM_FOLDERS_H
