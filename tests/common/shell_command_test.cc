#include <sys/wait.h>

#include <string>

#include <gtest/gtest.h>

#include "common/shell_command.h"
#include "tests/support/test_support.h"

TEST(ShellCommand, QuotesEveryTextArgumentSoTheShellSeesOneWord) {
  TempDeviceRoot root;
  const std::string hostile = root.Path("/it's $(touch pwned); `touch pwned2` a b");
  ShellCommand command(512);
  ASSERT_TRUE(command.Append("touch %s", {hostile}));
  ASSERT_EQ(0, RunShellCommand(command));
  EXPECT_TRUE(FileExists(hostile));
  for (const std::string marker : {"pwned", "pwned2"}) {
    EXPECT_FALSE(FileExists(marker) || FileExists(root.Path("/" + marker))) << marker;
  }
}

TEST(ShellCommand, FormatsNumbersAndRefusesMismatchedTemplates) {
  ShellCommand command(512);
  ASSERT_TRUE(command.Append("openssl genrsa -out %s %d", {"/k ey", 2048}));
  EXPECT_STREQ("openssl genrsa -out '/k ey' 2048", command.line());
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
  ShellPipe pipe(command);
  EXPECT_EQ(nullptr, pipe.stream());
  EXPECT_EQ(-1, pipe.Close());
  EXPECT_TRUE(log.Contains("Command refused, it does not fit its buffer")) << log.Text();
  EXPECT_FALSE(FileExists(root.Path("/ran")));
}

TEST(ShellCommand, ReportsTheRawStatusAndRunsWithoutInputOrTerminal) {
  ShellCommand exit3(64);
  exit3.Append("exit 3");
  int status = RunShellCommand(exit3);
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(3, WEXITSTATUS(status));

  ShellCommand command(256);
  command.Append("test ! -t 0 && test -z \"$(cat)\" && ! (exec 3</dev/tty) 2>/dev/null");
  EXPECT_EQ(0, RunShellCommand(command));

  ShellCommand reader(256);
  reader.Append("cat; echo done; if (exec 3</dev/tty) 2>/dev/null; then echo tty; fi");
  ShellPipe pipe(reader);
  ASSERT_NE(nullptr, pipe.stream());
  char line[64] = {0};
  ASSERT_NE(nullptr, fgets(line, sizeof(line), pipe.stream()));
  EXPECT_STREQ("done\n", line);
  EXPECT_EQ(nullptr, fgets(line, sizeof(line), pipe.stream()));
  EXPECT_EQ(0, pipe.Close());
}
