// Characters that are invisible to a reader of a file, or look like others.
#ifndef VORN_TESTS_SUPPORT_LINUX_UNSEEN_CHARACTERS_H
#define VORN_TESTS_SUPPORT_LINUX_UNSEEN_CHARACTERS_H

#include <string_view>

// Returns whether `text` is not UTF-8, or has control characters other than tabs and line feeds, line and paragraph
// separators, characters without width, marks of the direction of writing, or full-width forms of ASCII.
bool HasUnseenCharacters(std::string_view text);

#endif  // VORN_TESTS_SUPPORT_LINUX_UNSEEN_CHARACTERS_H
