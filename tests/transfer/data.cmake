# The data side of transfer: the read-once stream, the format list and the data object,
# and the clipboard between two processes. Both programs share a folder of their own with
# the stand-in library, whose simulated surveyor presses Enter after 300 ms.
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

# The driver owns the clipboard; the file receiver pastes from it in a process of its own.
add_executable(data_clipboard_driver ${CMAKE_CURRENT_SOURCE_DIR}/clipboard_driver.cpp
  ${MARLIX_DATA_TEST_SUPPORT} ${MARLIX_MODULE_RC})
marlix_module_rc_depends()
target_link_libraries(data_clipboard_driver PRIVATE marlix_test_support)
set_target_properties(data_clipboard_driver PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${MARLIX_DATA_TEST_DIR})
marlix_copy_standin(data_clipboard_driver)
add_dependencies(data_clipboard_driver shell_peer)
add_test(NAME data_clipboard COMMAND ${MARLIX_WINE_RUN} $<TARGET_FILE:data_clipboard_driver> ${MARLIX_SHELL_PEER})
marlix_wine_test(data_clipboard)
# The system clipboard is one for all processes: tests that copy take turns.
set_tests_properties(data_clipboard PROPERTIES RESOURCE_LOCK clipboard)
