// "orva-webapi renew" and serve's renewal check, through the second
// module's renewal with a stand-in for the ACME client in the device root.

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"

namespace {

// Runs orva-webapi with `arguments` on the device root; its exit status.
int RunHost(const std::string& root, const std::string& arguments) {
  const int status = std::system((std::string(ORVA_WEBAPI_PATH) + " " + arguments + " --root '" +
                                  root + "' >/dev/null 2>&1").c_str());
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

}  // namespace

TEST_F(ServeTest, RenewExitsByItsAnswerAndServeRenewsAtStartInAWritersTurn) {
  const std::string root = scratch_.root();
  // The client records its run, holds while /lego.hold exists (20 s at
  // most) and fails as an authority that refuses would.
  scratch_.WriteScript("/usr/orva/bin/lego",
                       "echo lego >>'" + root + "/lego.calls'\n"
                       "i=0; while [ -e '" + root + "/lego.hold' ] && [ $i -lt 2000 ]; do\n"
                       "  sleep 0.01; i=$((i+1))\ndone\n"
                       "echo 'stand-in authority: refused'; exit 1");
  const std::string calls = scratch_.Path("/lego.calls");
  const std::string set_up = "call ORVA.Core.Certificate.ACME set 'domains=[\"nas.example.test\"]' "
                             "email=admin@example.test agree_tos=yes";
  const struct {
    const char* what;
    std::string before;  // arguments of a call made first
    int status;
    std::string calls;
  } cases[] = {
      {"nothing due", "", 0, ""},
      {"the order fails", set_up, 1, "lego\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    if (!c.before.empty()) ASSERT_EQ(0, RunHost(root, c.before));
    EXPECT_EQ(c.status, RunHost(root, "renew"));
    EXPECT_EQ(c.calls, ReadFile(calls));
  }
  unlink(calls.c_str());

  scratch_.WriteFile("/lego.hold", "");
  ServeProcess server(root);
  ASSERT_TRUE(server.started()) << "a renewal under way does not hold up the start";
  ASSERT_TRUE(WaitFor([&] { return ReadFile(calls) == "lego\n"; })) << server.Log();
  const std::string mark = scratch_.Path("/mark");
  RawConnection change(server.http_port(),
                       "GET /webapi?api=ORVA.Test&method=echo&mark=" + mark +
                           " HTTP/1.1\r\nHost: d\r\nConnection: close\r\nAuthorization: Bearer " +
                           server.Token() + "\r\n\r\n");
  EXPECT_EQ("", change.Reply(500)) << "a change waits for the renewal's turn";
  EXPECT_FALSE(FileExists(mark));
  unlink(scratch_.Path("/lego.hold").c_str());
  EXPECT_EQ(200, RawStatus(change.Reply(10000)));
  EXPECT_TRUE(WaitFor([&] {
    const std::string log = server.Log();
    const std::string::size_type line =
        log.find("Certificate renewal failed, tried again at the next check: ");
    return line != std::string::npos &&
           log.find("stand-in authority: refused\"},\"error\":{\"code\":5523}", line) !=
               std::string::npos;
  })) << server.Log();
}
