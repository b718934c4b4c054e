// The main of every test executable: GoogleTest, with syslog opened under the test's name.
#include <gtest/gtest.h>
#include <syslog.h>

int main(int argc, char** argv) {
  testing::InitGoogleTest(&argc, argv);
  openlog(program_invocation_short_name, LOG_PID, LOG_USER);
  return RUN_ALL_TESTS();
}
