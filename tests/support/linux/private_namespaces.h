// Runs programs in mount and network namespaces of their own, with unshare(1): what they mount and configure is
// visible to nobody else and is gone when they end.
#ifndef VORN_TESTS_SUPPORT_LINUX_PRIVATE_NAMESPACES_H
#define VORN_TESTS_SUPPORT_LINUX_PRIVATE_NAMESPACES_H

#include <string>
#include <vector>

struct PrivateNamespaces {
  // The command line that a program and its arguments are appended to. The program runs as root of the namespaces.
  std::vector<std::string> command;
  // Why this machine does not allow it; empty if it does.
  std::string unavailable;
};

// Root makes the namespaces directly, which also works in a chroot(2), where the kernel refuses user namespaces.
// Everybody else makes a user namespace first. The answer is found out once per process. Not thread-safe.
const PrivateNamespaces& GetPrivateNamespaces();

#endif  // VORN_TESTS_SUPPORT_LINUX_PRIVATE_NAMESPACES_H
