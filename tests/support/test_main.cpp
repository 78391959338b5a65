// Every test program runs its tests on one apartment thread, as Explorer's windows do, and fails if none ran.
#include <windows.h>
#include <ole2.h>
#include <gtest/gtest.h>

#include <cstdio>

// Tests run on one single-threaded apartment, as the shell's browser threads do.
int main(int argc, char** argv) {
  testing::InitGoogleTest(&argc, argv);
  if (FAILED(OleInitialize(nullptr))) return 3;
  int rc = RUN_ALL_TESTS();
  OleUninitialize();
  // A program that ran nothing (a filter that matches no test, a driver whose own entry point
  // was lost) must not pass.
  if (rc == 0 && testing::UnitTest::GetInstance()->test_to_run_count() == 0) {
    std::fprintf(stderr, "no test ran\n");
    return 4;
  }
  return rc;
}
