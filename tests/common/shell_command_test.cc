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
  EXPECT_FALSE(FileExists("pwned"));
  EXPECT_FALSE(FileExists(root.Path("/pwned")));
  EXPECT_FALSE(FileExists("pwned2"));
}

TEST(ShellCommand, FormatsNumbersAndRefusesMismatchedTemplates) {
  ShellCommand command(512);
  ASSERT_TRUE(command.Append("openssl genrsa -out %s %d", {"/k ey", 2048}));
  EXPECT_STREQ("openssl genrsa -out '/k ey' 2048", command.line());

  ShellCommand missing(512);
  EXPECT_FALSE(missing.Append("cp %s %s", {"/a"}));
  ShellCommand wrong_kind(512);
  EXPECT_FALSE(wrong_kind.Append("days %d", {"10"}));
  ShellCommand extra(512);
  EXPECT_FALSE(extra.Append("ls", {"/a"}));
}

TEST(ShellCommand, LineThatDoesNotFitIsRefusedAndNeverRun) {
  TempDeviceRoot root;
  std::string marker = root.Path("/ran");
  ShellCommand command(64);
  command.Append("touch %s", {marker});
  command.Append(" %s", {std::string(60, 'x')});
  EXPECT_FALSE(command.fits());

  LogCapture log;
  EXPECT_EQ(-1, RunShellCommand(command));
  EXPECT_TRUE(log.Contains("Command refused, it does not fit its buffer"));
  EXPECT_FALSE(FileExists(marker));
}

TEST(ShellCommand, ExactFitIsAccepted) {
  ShellCommand command(8);
  EXPECT_TRUE(command.Append("echo 12"));  // 7 characters and the zero.
  EXPECT_FALSE(command.Append("3"));
}

TEST(ShellCommand, ReportsTheRawStatus) {
  ShellCommand command(64);
  command.Append("exit 3");
  int status = RunShellCommand(command);
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(3, WEXITSTATUS(status));
}

TEST(ShellCommand, CommandsHaveNoInputAndNoTerminal) {
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

TEST(ShellPipe, RefusedCommandHasNoStream) {
  ShellCommand command(16);
  command.Append("echo %s", {std::string(40, 'y')});
  LogCapture log;
  ShellPipe pipe(command);
  EXPECT_EQ(nullptr, pipe.stream());
  EXPECT_EQ(-1, pipe.Close());
}
