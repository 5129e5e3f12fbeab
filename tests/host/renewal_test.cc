// "orva-webapi renew" and serve's renewal check, served by the test
// module's stand-in for the renewal method.

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"

TEST_F(ServeTest, RenewExitsByItsAnswerAndServeRenewsAtStartInAWritersTurn) {
  const std::string calls = scratch_.Path("/renew.calls");
  const struct {
    const char* what;
    bool fails;
    int status;
  } cases[] = {
      {"renewed", false, 0},
      {"renewal failed", true, 1},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    if (c.fails) scratch_.WriteFile("/renew.fails", "");
    const int status = std::system((std::string(ORVA_WEBAPI_PATH) + " renew --root '" +
                                    scratch_.root() + "' --module " + ORVA_TEST_MODULE_PATH +
                                    " >/dev/null 2>&1").c_str());
    ASSERT_TRUE(WIFEXITED(status));
    EXPECT_EQ(c.status, WEXITSTATUS(status));
  }
  EXPECT_EQ("renew\nrenew\n", ReadFile(calls));
  unlink(scratch_.Path("/renew.fails").c_str());
  unlink(calls.c_str());

  scratch_.WriteFile("/renew.hold", "");
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << "a renewal under way does not hold up the start";
  ASSERT_TRUE(WaitFor([&] { return ReadFile(calls) == "renew\n"; }));
  const std::string mark = scratch_.Path("/mark");
  RawConnection change(server.http_port(),
                       "GET /webapi?api=ORVA.Test&method=echo&mark=" + mark +
                           " HTTP/1.1\r\nHost: d\r\nConnection: close\r\nAuthorization: Bearer " +
                           server.Token() + "\r\n\r\n");
  EXPECT_EQ("", change.Reply(500)) << "a change waits for the renewal's turn";
  EXPECT_FALSE(FileExists(mark));
  unlink(scratch_.Path("/renew.hold").c_str());
  EXPECT_EQ(200, RawStatus(change.Reply(10000)));
  EXPECT_TRUE(FileExists(mark));
  EXPECT_TRUE(WaitFor([&] {
    return server.Log().find("Certificate renewal done: {\"data\":{}") != std::string::npos;
  })) << server.Log();
}
