# The data side of transfer: the read-once stream, the format list, the data object and the
# clipboard between two processes. The program has a folder of its own with the stand-in
# library, whose simulated surveyor presses Enter after 300 ms.
set(MARLIX_DATA_TEST_DIR ${CMAKE_CURRENT_BINARY_DIR}/data)
file(MAKE_DIRECTORY ${MARLIX_DATA_TEST_DIR})
file(WRITE ${MARLIX_DATA_TEST_DIR}/MarlixComm.txt "delay_ms=300\n")
set(MARLIX_DATA_TEST_SUPPORT ${CMAKE_CURRENT_SOURCE_DIR}/data_test_support.cpp
    ${CMAKE_SOURCE_DIR}/tools/marlix_comm/survey_job.cpp)

marlix_test(data_tests SOURCES
  ${CMAKE_CURRENT_SOURCE_DIR}/data_object_test.cpp
  ${MARLIX_DATA_TEST_SUPPORT})
set_target_properties(data_tests PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${MARLIX_DATA_TEST_DIR})
marlix_copy_standin(data_tests)

# The clipboard is one for all processes: tests that copy take turns. A copied file is pasted by
# the shell's stand-in in a process of its own, whose window must not wait on another test's
# windows on the display.
add_dependencies(data_tests shell_peer)
set_tests_properties(data_tests PROPERTIES RESOURCE_LOCK "clipboard;display"
  ENVIRONMENT "WINEPREFIX=${MARLIX_WINEPREFIX};WINEDEBUG=-all;MARLIX_SHELL_PEER=${MARLIX_SHELL_PEER}")
