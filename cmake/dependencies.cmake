# SPDX-License-Identifier: MIT
# Every library here is a Debian package; scripts/install-dependencies installs them.
find_package(PkgConfig REQUIRED)
find_package(Threads REQUIRED)
find_package(fmt REQUIRED)
find_package(pugixml REQUIRED)
find_package(nlohmann_json REQUIRED)
find_package(CLI11 REQUIRED)
find_package(OpenSSL REQUIRED COMPONENTS Crypto)
pkg_check_modules(systemd REQUIRED IMPORTED_TARGET libsystemd)
pkg_check_modules(sqlite3 REQUIRED IMPORTED_TARGET sqlite3)
pkg_check_modules(pcre2 REQUIRED IMPORTED_TARGET libpcre2-8)
pkg_check_modules(zlib REQUIRED IMPORTED_TARGET zlib)
find_library(UNISTRING_LIBRARY unistring REQUIRED)
