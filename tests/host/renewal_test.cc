// "orva-webapi renew" and serve's renewal check, through the second
// module's renewal with a stand-in for the ACME client in the device root.

#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"

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
  auto host = [&](const std::string& arguments) {  // true when it exits with 0
    return RunForTest(std::string(ORVA_WEBAPI_PATH) + " " + arguments + " --root '" + root + "'");
  };
  EXPECT_TRUE(host("renew")) << "nothing is due";
  EXPECT_EQ("", ReadFile(calls));
  ASSERT_TRUE(host("call ORVA.Core.Certificate.ACME set 'domains=[\"nas.example.test\"]' "
                   "email=admin@example.test agree_tos=yes"));
  EXPECT_FALSE(host("renew")) << "the order fails";
  EXPECT_EQ("lego\n", ReadFile(calls));
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
  const std::string failed = "Certificate renewal failed, tried again at the next check: {\"data\":"
                             "{\"error\":\"stand-in authority: refused\"},\"error\":{\"code\":5523}";
  EXPECT_TRUE(WaitFor([&] { return server.Log().find(failed) != std::string::npos; })) << server.Log();
}
