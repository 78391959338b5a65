# GoogleTest from Debian's source package, built by the same cross compiler.
set(INSTALL_GTEST OFF CACHE BOOL "" FORCE)
set(BUILD_GMOCK ON CACHE BOOL "" FORCE)
add_subdirectory(/usr/src/googletest ${CMAKE_BINARY_DIR}/googletest EXCLUDE_FROM_ALL SYSTEM)

# One throwaway Wine prefix per build tree, made once (about 10 s). Its daemons run from the
# first test to the last, apart from every test's output (see scripts/wine-daemons).
set(MARLIX_WINEPREFIX ${CMAKE_BINARY_DIR}/wineprefix)
set(MARLIX_WINE_RUN ${CMAKE_SOURCE_DIR}/scripts/wine-run)
set(MARLIX_WINE_DAEMONS ${CMAKE_SOURCE_DIR}/scripts/wine-daemons)
add_test(NAME wine_prefix COMMAND ${MARLIX_WINE_DAEMONS} ${MARLIX_WINEPREFIX})
add_test(NAME wine_prefix_stop COMMAND ${MARLIX_WINE_DAEMONS} --stop ${MARLIX_WINEPREFIX})
set_tests_properties(wine_prefix PROPERTIES FIXTURES_SETUP wine TIMEOUT 300)
set_tests_properties(wine_prefix_stop PROPERTIES FIXTURES_CLEANUP wine TIMEOUT 60)

add_library(marlix_test_support STATIC
  ${CMAKE_SOURCE_DIR}/tests/support/test_main.cpp
  ${CMAKE_SOURCE_DIR}/tests/support/registry_sandbox.cpp)
target_include_directories(marlix_test_support PUBLIC ${CMAKE_SOURCE_DIR}/tests)
target_link_libraries(marlix_test_support PUBLIC marlix_core GTest::gtest GTest::gmock)

# Marks a CTest test as running under Wine in the build's prefix.
function(marlix_wine_test test_name)
  set_tests_properties(${test_name} PROPERTIES
    FIXTURES_REQUIRED wine
    ENVIRONMENT "WINEPREFIX=${MARLIX_WINEPREFIX};WINEDEBUG=-all"
    TIMEOUT 600)
endfunction()

# marlix_test(<name> SOURCES <files...> [LIBS <targets...>])
# Builds a GoogleTest program with the core and the module's resources, and runs it under Wine.
function(marlix_test name)
  cmake_parse_arguments(T "" "" "SOURCES;LIBS" ${ARGN})
  add_executable(${name} ${T_SOURCES} ${MARLIX_MODULE_RC})
  marlix_module_rc_depends()
  target_link_libraries(${name} PRIVATE marlix_test_support ${T_LIBS})
  add_test(NAME ${name} COMMAND ${name})
  marlix_wine_test(${name})
endfunction()

# A second process acting as the shell would: receiver of virtual files (drop or paste), drag source.
# Test programs get its Windows path from MARLIX_SHELL_PEER.
add_executable(shell_peer ${CMAKE_SOURCE_DIR}/tests/support/shell_peer.cpp)
target_link_options(shell_peer PRIVATE -municode)
target_link_libraries(shell_peer PRIVATE ole32 shell32 uuid)
set_target_properties(shell_peer PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests/bin)
string(REPLACE "/" "\\" MARLIX_SHELL_PEER "Z:${CMAKE_BINARY_DIR}/tests/bin/shell_peer.exe")
