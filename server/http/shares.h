// Chooses the connection to close when there are too many.
#ifndef VORN_SERVER_SHARES_H
#define VORN_SERVER_SHARES_H

#include <chrono>
#include <cstddef>
#include <string_view>
#include <vector>

namespace vorn::server {

// The activity of a connection, in the order in which connections are closed.
enum class Activity {
  kEnding,   // answered for the last time
  kIdle,     // between two requests, or before the first
  kWaiting,  // for the client: to send the rest of a request or to take an answer
  kWorking,  // the client waits for the server; never closed
};

// One connection of a listener.
struct ConnectionUse {
  std::string_view share_key;  // Peer::ShareKey(), which must outlive this
  Activity activity = Activity::kIdle;
  std::chrono::steady_clock::time_point since;  // of this activity; receiving single bytes does not renew it
};

// The connections that a listener may have.
struct ConnectionShare {
  std::size_t total;
  std::size_t per_address;
};

// Returns whether `left` is closed before `right`.
bool GoesFirst(const ConnectionUse& left, const ConnectionUse& right);

constexpr std::size_t kNoConnection = static_cast<std::size_t>(-1);

// The index of the connection to close after a new one, the last of `uses`, was accepted: one of the same address if
// that has more than its share, else one of any address if the listener has more than its own. Returns kNoConnection if
// there is room, or if the surplus consists of connections that are working.
std::size_t SurplusOf(const std::vector<ConnectionUse>& uses, const ConnectionShare& share);

// Whether more connections than the listener may have are there because most of its share waits for the server, and
// not because one address has more than its own share. Then a call should end, rather than the connection of a client
// that is about to send a request.
bool CallsCrowdOut(const std::vector<ConnectionUse>& uses, const ConnectionShare& share);

// Returns the index of the most expendable connection, or kNoConnection.
std::size_t MostExpendable(const std::vector<ConnectionUse>& uses);

}  // namespace vorn::server

#endif  // VORN_SERVER_SHARES_H
