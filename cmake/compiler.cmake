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
  add_compile_options(-Wno-attributes)  # clang's thread-safety attributes are unknown to GCC
endif()

if(BRIVOD_SANITIZE)
  add_compile_options(-fsanitize=${BRIVOD_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${BRIVOD_SANITIZE})
endif()
