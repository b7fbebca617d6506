#include "unified_diff.h"

#include <algorithm>
#include <cstddef>
#include <vector>

namespace vorn {
namespace {

using Lines = std::vector<std::string_view>;

constexpr int kMostDifferences = 1000;

// Each line has its line break; the last one may have none.
Lines SplitLines(std::string_view text) {
  Lines lines;
  while (!text.empty()) {
    const std::size_t end = std::min(text.find('\n'), text.size() - 1) + 1;
    lines.push_back(text.substr(0, end));
    text.remove_prefix(end);
  }
  return lines;
}

// Lines that are replaced: `removed` lines of the old version from `old_begin`, by `added` lines of the new one.
struct Change {
  int old_begin;
  int removed;
  int new_begin;
  int added;
};

// The shortest edit script of the lines between two positions, forwards: furthest[k] is the position in the old version
// that a path with d changes reaches on the diagonal k. The states of all d are kept to walk the path back.
class ShortestScript {
 public:
  ShortestScript(const Lines& before, const Lines& after) : before_(before), after_(after) {
    while (begin_ < Smaller() && before_[At(begin_)] == after_[At(begin_)]) ++begin_;
    old_end_ = static_cast<int>(before_.size());
    new_end_ = static_cast<int>(after_.size());
    while (std::min(old_end_, new_end_) > begin_ && before_[At(old_end_ - 1)] == after_[At(new_end_ - 1)]) {
      --old_end_;
      --new_end_;
    }
  }

  std::vector<Change> Find() {
    if (begin_ == old_end_ && begin_ == new_end_) return {};
    const int most = old_end_ + new_end_ - 2 * begin_;
    for (int d = 0; d <= std::min(most, kMostDifferences); ++d) {
      if (Advance(d)) return WalkBack(d);
    }
    return {{begin_, old_end_ - begin_, begin_, new_end_ - begin_}};
  }

 private:
  static std::size_t At(int index) { return static_cast<std::size_t>(index); }
  int Smaller() const { return static_cast<int>(std::min(before_.size(), after_.size())); }

  // Whether the best path with d changes to the diagonal k ends with an added line.
  static bool EndsWithAddition(const std::vector<int>& last, int d, int k) {
    return k == -d || (k != d && last[At(k - 1 + d)] < last[At(k + 1 + d)]);
  }

  // The state of d has the diagonals -d-1 to d+1, so that the next state finds its neighbours.
  bool Advance(int d) {
    std::vector<int> reached(At(2 * d + 3), begin_);
    for (int k = -d; k <= d; k += 2) {
      int x = begin_;
      if (d > 0)
        x = EndsWithAddition(states_.back(), d, k) ? states_.back()[At(k + 1 + d)] : states_.back()[At(k - 1 + d)] + 1;
      while (x < old_end_ && x - k < new_end_ && before_[At(x)] == after_[At(x - k)]) ++x;
      reached[At(k + d + 1)] = x;
      if (k == old_end_ - new_end_ && x >= old_end_) {
        states_.push_back(std::move(reached));
        return true;
      }
    }
    states_.push_back(std::move(reached));
    return false;
  }

  std::vector<Change> WalkBack(int d) const {
    std::vector<Change> changes;
    int k = old_end_ - new_end_;
    for (; d > 0; --d) {
      const std::vector<int>& last = states_[At(d - 1)];
      const bool adds = EndsWithAddition(last, d, k);
      k += adds ? 1 : -1;
      const int x = last[At(k + d)];
      Prepend({x, adds ? 0 : 1, x - k, adds ? 1 : 0}, &changes);
    }
    std::reverse(changes.begin(), changes.end());
    return changes;
  }

  // The changes are found from the last one to the first one.
  static void Prepend(const Change& change, std::vector<Change>* changes) {
    if (!changes->empty()) {
      Change& next = changes->back();
      if (change.old_begin + change.removed == next.old_begin && change.new_begin + change.added == next.new_begin) {
        next = {change.old_begin, change.removed + next.removed, change.new_begin, change.added + next.added};
        return;
      }
    }
    changes->push_back(change);
  }

  const Lines& before_;
  const Lines& after_;
  int begin_ = 0;  // the first line that differs, in both versions
  int old_end_ = 0;
  int new_end_ = 0;
  std::vector<std::vector<int>> states_;
};

void AddLine(char mark, std::string_view line, std::string* text) {
  text->push_back(mark);
  text->append(line);
  if (line.back() != '\n') text->append("\n\\ No newline at end of file\n");
}

// "3,2", or "3" for one line. An empty range is named by the line before it.
std::string RangeOf(int begin, int count) {
  if (count == 1) return std::to_string(begin + 1);
  return std::to_string(count == 0 ? begin : begin + 1) + "," + std::to_string(count);
}

class Hunks {
 public:
  Hunks(const Lines& before, const Lines& after, int context) : before_(before), after_(after), context_(context) {}

  std::string Text(const std::vector<Change>& changes) const {
    std::string text;
    for (std::size_t first = 0; first < changes.size();) {
      std::size_t end = first + 1;
      while (end < changes.size() && Gap(changes[end - 1], changes[end]) <= 2 * context_) ++end;
      AddHunk(&changes[first], &changes[end - 1], &text);
      first = end;
    }
    return text;
  }

 private:
  static int Gap(const Change& a, const Change& b) { return b.old_begin - a.old_begin - a.removed; }

  void AddHunk(const Change* first, const Change* last, std::string* text) const {
    const int before = std::min(context_, first->old_begin);
    const int old_end = last->old_begin + last->removed;
    const int behind = std::min(context_, static_cast<int>(before_.size()) - old_end);
    const int old_begin = first->old_begin - before;
    const int new_begin = first->new_begin - before;
    const int new_count = last->new_begin + last->added + behind - new_begin;
    *text += "@@ -" + RangeOf(old_begin, old_end + behind - old_begin) + " +" + RangeOf(new_begin, new_count) + " @@\n";
    int line = old_begin;
    for (const Change* change = first; change <= last; ++change) {
      AddLines(' ', before_, line, change->old_begin, text);
      AddLines('-', before_, change->old_begin, change->old_begin + change->removed, text);
      AddLines('+', after_, change->new_begin, change->new_begin + change->added, text);
      line = change->old_begin + change->removed;
    }
    AddLines(' ', before_, line, old_end + behind, text);
  }

  static void AddLines(char mark, const Lines& lines, int begin, int end, std::string* text) {
    for (int i = begin; i < end; ++i) AddLine(mark, lines[static_cast<std::size_t>(i)], text);
  }

  const Lines& before_;
  const Lines& after_;
  const int context_;
};

}  // namespace

std::string UnifiedDiff(const std::string& path, std::optional<std::string_view> before,
                        std::optional<std::string_view> after, int context) {
  const Lines old_lines = SplitLines(before.value_or(""));
  const Lines new_lines = SplitLines(after.value_or(""));
  const std::string hunks = Hunks(old_lines, new_lines, context).Text(ShortestScript(old_lines, new_lines).Find());
  if (hunks.empty() && before.has_value() == after.has_value()) return "";
  const auto name = [&path](bool exists) { return exists ? path : "/dev/null"; };
  return "--- " + name(before.has_value()) + "\n+++ " + name(after.has_value()) + "\n" + hunks;
}

}  // namespace vorn
