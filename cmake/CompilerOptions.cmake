# The options of all targets: C++17, warnings as errors, hidden symbols, hardened in release.
set(CMAKE_CXX_STANDARD 17)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
# Run paths are relative to the program ($ORIGIN), so that a build tree can be moved and installed unchanged.
set(CMAKE_BUILD_RPATH_USE_ORIGIN ON)

add_compile_options(-Wall -Wextra -Wshadow -Wconversion -Wformat=2 -Wnon-virtual-dtor -Wold-style-cast
                    -Woverloaded-virtual -Wcast-qual -Werror)
# Part of -Wconversion for clang, and not for g++.
add_compile_options($<$<CXX_COMPILER_ID:Clang>:-Wno-sign-conversion>)
# Not with the sanitizers, which have checks of their own.
if(NOT VORN_SANITIZE)
  add_compile_options(-fstack-protector-strong $<$<CONFIG:Release,RelWithDebInfo>:-D_FORTIFY_SOURCE=2>)
  add_link_options(-Wl,-z,relro,-z,now)
endif()

if(VORN_SANITIZE)
  add_compile_options(-fsanitize=${VORN_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${VORN_SANITIZE})
endif()

if(VORN_COVERAGE)
  add_compile_options(--coverage -fprofile-update=atomic)
  add_link_options(--coverage)
endif()

find_program(CCACHE ccache)
if(CCACHE)
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CCACHE})
endif()
