# SPDX-License-Identifier: MIT
# Warnings and sanitizers, the same for every target.
find_program(CCACHE ccache)
if(CCACHE)
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CCACHE})
endif()

add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Wold-style-cast
                    -Wcast-align -Woverloaded-virtual -Werror)
if(CMAKE_CXX_COMPILER_ID MATCHES "Clang")
  add_compile_options(-Wthread-safety)
else()
  # Clang's thread-safety attributes are unknown to GCC, and GCC 12 sees overflows in std::string's operator+ that are
  # not there (GCC bug 105651).
  add_compile_options(-Wno-attributes -Wno-array-bounds -Wno-restrict -Wno-stringop-overflow)
endif()

if(BRIVOD_SANITIZE)
  add_compile_options(-fsanitize=${BRIVOD_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${BRIVOD_SANITIZE})
endif()
