// Runs programs in mount and network namespaces of their own, with unshare(1). Other processes do not see what they
// mount and configure, and the kernel removes it when they end.
#ifndef VORN_TESTS_SUPPORT_LINUX_PRIVATE_NAMESPACES_H
#define VORN_TESTS_SUPPORT_LINUX_PRIVATE_NAMESPACES_H

#include <string>
#include <vector>

struct PrivateNamespaces {
  // The command line to which a program and its arguments are appended. The program runs as root of the namespaces.
  std::vector<std::string> command;
  // The reason why this machine does not permit such namespaces; empty if it does.
  std::string unavailable;
};

// Root makes the namespaces directly, which also works in a chroot(2), where the kernel refuses user namespaces.
// Other users create a user namespace first. The result is determined once per process. Not thread-safe.
const PrivateNamespaces& GetPrivateNamespaces();

#endif  // VORN_TESTS_SUPPORT_LINUX_PRIVATE_NAMESPACES_H
