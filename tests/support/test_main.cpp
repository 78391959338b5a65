// Every test program runs its tests on one apartment thread, as Explorer's windows do, and fails if none ran.
#include <windows.h>
#include <ole2.h>
#include <gtest/gtest.h>
#include <cstdio>
int main(int argc, char** argv) {
  testing::InitGoogleTest(&argc, argv);
  if (FAILED(OleInitialize(nullptr))) return 3;
  int rc = RUN_ALL_TESTS();
  OleUninitialize();
  // A filter that matches nothing, or a driver that lost its own entry point, must not pass.
  if (rc == 0 && testing::UnitTest::GetInstance()->test_to_run_count() == 0) {
    std::fprintf(stderr, "no test ran\n");
    return 4;
  }
  return rc;
}
