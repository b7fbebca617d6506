// Ranges of the addresses of hosts.
#ifndef VORN_LINUX_ACCESS_ADDRESS_RANGES_H
#define VORN_LINUX_ACCESS_ADDRESS_RANGES_H

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vorn {

// A family (4 or 6) and an address of it in network order, so that the addresses of a family are in their usual order.
using AddressBytes = std::array<std::uint8_t, 17>;

struct AddressRange {
  AddressBytes first;
  AddressBytes last;
};

// Returns the range of an address or a network of exports(5); nullopt for every other text, and for a mask with gaps.
std::optional<AddressRange> AddressRangeOf(const std::string& client);

// Addresses that export rules name. Not thread-safe.
class AddressRanges {
 public:
  void Add(const AddressRange& range) { ranges_.push_back(range); }

  // Has to be called after the last Add().
  void Sort();

  // Returns the first address of `network`, from `begin` on, that is in no range inside of the network, and that is
  // not its broadcast address; nullopt if there is none. A range that is the network itself does not count. Takes a
  // time that is linear in the number of ranges.
  std::optional<AddressBytes> FirstFree(const AddressRange& network, const AddressBytes& begin) const;

 private:
  std::vector<AddressRange> ranges_;
};

// Returns the first address that a host of the network may have.
AddressBytes FirstHostOf(const AddressRange& network);

std::string TextOf(const AddressBytes& address);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_ADDRESS_RANGES_H
