# The data side of transfer: the read-once stream, the format list and the data object.
marlix_test(data_tests SOURCES
  ${CMAKE_CURRENT_SOURCE_DIR}/stream2_test.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/enum_format_etc_test.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/data_object_test.cpp
  ${CMAKE_CURRENT_SOURCE_DIR}/data_test_support.cpp)
