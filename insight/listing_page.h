// The page of a listing whose total only the platform knows.
#ifndef VORN_INSIGHT_LISTING_PAGE_H
#define VORN_INSIGHT_LISTING_PAGE_H

#include <climits>

#include "parameter_reader.h"

// Items from the index `offset` on, at most `limit`.
struct ListingPage {
  static constexpr int kMost = 1000;
  static constexpr int kUsual = 50;

  int offset;
  int limit;

  // Reads the parameters "offset" and "limit".
  static ListingPage Read(ParameterReader& reader) {
    const auto offset = static_cast<int>(reader.Integer("offset", 0, 0, INT_MAX));
    const auto limit = static_cast<int>(reader.Integer("limit", kUsual, 0, kMost));
    return {offset, limit};
  }
};

#endif  // VORN_INSIGHT_LISTING_PAGE_H
