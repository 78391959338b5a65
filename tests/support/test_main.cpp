#include <windows.h>
#include <ole2.h>
#include <gtest/gtest.h>

// Tests run on one single-threaded apartment, as the shell's browser threads do.
int main(int argc, char** argv) {
  testing::InitGoogleTest(&argc, argv);
  if (FAILED(OleInitialize(nullptr))) return 3;
  int rc = RUN_ALL_TESTS();
  OleUninitialize();
  return rc;
}
