# What the host stands on, found in one way. What only the command, the tests or the benchmarks need
# is found by them.
find_package(PkgConfig REQUIRED)
pkg_check_modules(SQLITE3 REQUIRED IMPORTED_TARGET sqlite3)
pkg_check_modules(LIBSECCOMP REQUIRED IMPORTED_TARGET libseccomp)
pkg_check_modules(LIBARCHIVE REQUIRED IMPORTED_TARGET libarchive)
pkg_check_modules(LIBCRYPTO REQUIRED IMPORTED_TARGET libcrypto>=3)
pkg_check_modules(ZLIB REQUIRED IMPORTED_TARGET zlib)
# Linked in: to look one more library up would slow every start of the command.
find_library(LIBMD libmd.a REQUIRED)
