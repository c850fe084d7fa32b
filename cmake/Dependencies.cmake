# Every dependency is a Debian package found through pkg-config and exposed
# as an imported target named PkgConfig::<NAME>: first the libraries' own,
# then what only the tests, benchmarks and tools use.
include(${CMAKE_CURRENT_LIST_DIR}/LibraryDependencies.cmake)
pkg_check_modules(GEOGRAPHICLIB IMPORTED_TARGET geographiclib)
# cpp-httplib serves the loopback servers of the tests, benchmarks and demo,
# never the library. Debian ships it compiled, with definitions that change its
# types, so its users must take those definitions from pkg-config too.
pkg_check_modules(CPP_HTTPLIB REQUIRED IMPORTED_TARGET cpp-httplib)
