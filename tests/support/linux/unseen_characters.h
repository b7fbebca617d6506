// Characters that a reader of a file does not see, or takes for others.
#ifndef VORN_TESTS_SUPPORT_LINUX_UNSEEN_CHARACTERS_H
#define VORN_TESTS_SUPPORT_LINUX_UNSEEN_CHARACTERS_H

#include <string_view>

// Whether `text` is no UTF-8, or has control characters but tabs and line feeds, line and paragraph separators,
// characters without width, marks of the direction of writing, or full-width forms of ASCII.
bool HasUnseenCharacters(std::string_view text);

#endif  // VORN_TESTS_SUPPORT_LINUX_UNSEEN_CHARACTERS_H
