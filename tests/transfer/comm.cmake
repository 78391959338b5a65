# The instrument side of transfer: the library contract, the stand-in, the download
# dialog and the change notification among views.
marlix_test(comm_tests SOURCES
  ${CMAKE_CURRENT_SOURCE_DIR}/download_dialog_test.cpp)
# A folder of its own: the stand-in's control file and log live beside the program.
set_target_properties(comm_tests PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR}/comm)
marlix_copy_standin(comm_tests)
add_dependencies(comm_tests MarlixCommNoExport)
add_custom_command(TARGET comm_tests POST_BUILD
  COMMAND ${CMAKE_COMMAND} -E copy_if_different $<TARGET_FILE:MarlixCommNoExport> $<TARGET_FILE_DIR:comm_tests>)
