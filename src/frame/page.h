// Paging of listings.
#ifndef VORN_SRC_PAGE_H
#define VORN_SRC_PAGE_H

#include <algorithm>
#include <cstdint>

// The half-open range [begin, end) of item indexes.
struct Page {
  int begin;
  int end;

  // Returns the page of `limit` items from `offset` on, of a listing of `count` items. A limit of -1
  // means all items from the offset on; 0 and any other negative limit give an empty page. An offset
  // outside the listing counts as 0 (docs/decisions/0026). Safe for all values.
  static Page Of(int count, int offset, int limit) {
    const int begin = offset < 0 || offset >= count ? 0 : offset;
    const std::int64_t wanted = limit == -1 ? count - begin : limit;
    const std::int64_t end = std::clamp<std::int64_t>(begin + wanted, begin, count);
    return {begin, static_cast<int>(end)};
  }
};

#endif  // VORN_SRC_PAGE_H
