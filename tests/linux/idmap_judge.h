// Reads an idmapd.conf with libnfsidmap, the ID-mapping library of nfs-utils.
#ifndef VORN_TESTS_LINUX_IDMAP_JUDGE_H
#define VORN_TESTS_LINUX_IDMAP_JUDGE_H

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

// The library ended its process, or did not return. If it only refuses a file, the functions below throw
// std::runtime_error.
struct LibraryCrash : std::runtime_error {
  using std::runtime_error::runtime_error;
};

// Returns the local user ID of each Kerberos principal; nullopt for a principal without a mapping. Local names are
// looked up on this system.
std::vector<std::optional<unsigned>> MapByLibrary(const std::string& path, const std::vector<std::string>& principals);

// Returns the NFSv4 domain.
std::string DomainByLibrary(const std::string& path);

#endif  // VORN_TESTS_LINUX_IDMAP_JUDGE_H
