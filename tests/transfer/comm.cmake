# The instrument side of transfer: the library contract and the download dialog.
marlix_test(comm_tests SOURCES
  ${CMAKE_CURRENT_SOURCE_DIR}/download_dialog_test.cpp)
# A folder of its own: the stand-in's control file and log live beside the program.
set(MARLIX_COMM_TEST_DIR ${CMAKE_CURRENT_BINARY_DIR}/comm)
set_target_properties(comm_tests PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${MARLIX_COMM_TEST_DIR})
marlix_copy_standin(comm_tests)
add_dependencies(comm_tests MarlixCommNoExport)
# Copies of the program in folders without the library and with one that lacks its export.
file(MAKE_DIRECTORY ${MARLIX_COMM_TEST_DIR}/missing ${MARLIX_COMM_TEST_DIR}/noexport)
add_custom_command(TARGET comm_tests POST_BUILD
  COMMAND ${CMAKE_COMMAND} -E copy_if_different $<TARGET_FILE:comm_tests> ${MARLIX_COMM_TEST_DIR}/missing
  COMMAND ${CMAKE_COMMAND} -E copy_if_different $<TARGET_FILE:comm_tests> ${MARLIX_COMM_TEST_DIR}/noexport
  COMMAND ${CMAKE_COMMAND} -E copy_if_different $<TARGET_FILE:MarlixCommNoExport>
          ${MARLIX_COMM_TEST_DIR}/noexport/MarlixComm.dll)
# Each in a fresh process, so no earlier test has loaded the library; exactly one test must run and pass.
foreach(run "CancelBeforeStartNeverLoadsTheLibrary:." "MissingLibraryIsReportedWithItsPath:missing"
            "LibraryWithoutCreateInstanceIsReportedWithoutPath:noexport")
  string(REPLACE ":" ";" run "${run}")
  list(GET run 0 name)
  list(GET run 1 folder)
  add_test(NAME comm_${name} COMMAND ${MARLIX_WINE_RUN} ${MARLIX_COMM_TEST_DIR}/${folder}/comm_tests.exe
           --gtest_also_run_disabled_tests --gtest_filter=DownloadDialog.DISABLED_${name})
  marlix_wine_test(comm_${name})
  set_tests_properties(comm_${name} PROPERTIES PASS_REGULAR_EXPRESSION "\\[  PASSED  \\] 1 test\\."
                       FAIL_REGULAR_EXPRESSION "FAILED" RESOURCE_LOCK display)
endforeach()
# Its dialogs come up on the display that the window tests drive with real input.
set_tests_properties(comm_tests PROPERTIES RESOURCE_LOCK display)
