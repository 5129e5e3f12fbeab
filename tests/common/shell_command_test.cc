// The one way commands run: every text argument one quoted word, lines
// that do not fit refused, and no input or terminal to wait on.

#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "common/shell_command.h"
#include "tests/support/test_support.h"

TEST(ShellCommand, QuotesEveryTextArgumentAndRefusesMismatchedTemplates) {
  TempDeviceRoot root;
  const std::string hostile = root.Path("/it's $(touch pwned); `touch pwned2` a b");
  ShellCommand command(512);
  ASSERT_TRUE(command.Append("touch %s", {hostile}));
  ASSERT_EQ(0, RunShellCommand(command));
  EXPECT_TRUE(FileExists(hostile));
  for (const std::string marker : {"pwned", "pwned2"}) {
    EXPECT_FALSE(FileExists(marker) || FileExists(root.Path("/" + marker))) << marker;
  }
  EXPECT_FALSE(ShellCommand(512).Append("cp %s %s", {"/a"}));
  EXPECT_FALSE(ShellCommand(512).Append("days %d", {"10"}));
  EXPECT_FALSE(ShellCommand(512).Append("ls", {"/a"}));
}

TEST(ShellCommand, LineThatDoesNotFitIsRefusedAndNeverRun) {
  ShellCommand exact(8);
  EXPECT_TRUE(exact.Append("echo 12"));  // 7 characters and the zero.
  EXPECT_FALSE(exact.Append("3"));
  TempDeviceRoot root;
  ShellCommand command(64);
  command.Append("touch %s", {root.Path("/ran")});
  EXPECT_FALSE(command.Append(" %s", {std::string(60, 'x')}));
  LogCapture log;
  EXPECT_EQ(-1, RunShellCommand(command));
  EXPECT_TRUE(log.Contains("Command refused, it does not fit its buffer")) << log.Text();
  EXPECT_FALSE(FileExists(root.Path("/ran")));
  // A line that fits on the device fits under any root with its most paths.
  std::string device_line = "true", rooted_line = "true";
  for (size_t i = 0; i < kMaxRootedPaths; ++i) {
    device_line += " /p";
    rooted_line += " " + root.root() + "/p";
  }
  EXPECT_TRUE(ShellCommand(RootedCommandSize(device_line.size() + 1)).Append(rooted_line.c_str()));
}

// The test's own input holds a line, which the command must not read.
TEST(ShellCommand, RunsWithoutInputOrTerminal) {
  int typed[2];
  ASSERT_EQ(0, pipe(typed));
  ASSERT_EQ(7, write(typed[1], "secret\n", 7));
  close(typed[1]);
  const int input = dup(STDIN_FILENO);
  dup2(typed[0], STDIN_FILENO);
  close(typed[0]);
  ShellCommand command(256);
  command.Append("test -z \"$(cat)\" && ! (exec 3</dev/tty) 2>/dev/null");
  const int status = RunShellCommand(command);
  dup2(input, STDIN_FILENO);
  close(input);
  EXPECT_EQ(0, status);
}
