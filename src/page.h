// The part of a listing that a request asks for.
#ifndef VORN_SRC_PAGE_H
#define VORN_SRC_PAGE_H

#include <algorithm>
#include <cstdint>

// Items `begin` to `end` (not included) of a listing.
struct Page {
  int begin;
  int end;

  // Of `count` items the `limit` ones from `offset` on; -1 stands for all of them. An offset outside
  // the listing shows its beginning; any other limit below 1 shows nothing.
  static Page Of(int count, int offset, int limit) {
    const int begin = offset < 0 || offset >= count ? 0 : offset;
    const std::int64_t wanted = limit == -1 ? count - begin : limit;
    const std::int64_t end = std::clamp<std::int64_t>(begin + wanted, begin, count);
    return {begin, static_cast<int>(end)};
  }
};

#endif  // VORN_SRC_PAGE_H
