// Keys: output of the tool is installed only whole.

#include <string>

#include <gtest/gtest.h>

#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/store_state.h"
#include "toolkit/mkcert.h"

// The stand-in writes a whole key to the file after "-out", or nothing, as
// on a full disk, and exits with the status given.
TEST(GenKey, OnlyAWholeKeyFromAToolThatSucceededReplacesTheOldKey) {
  const char kWhole[] = "cat \"$ORVA_ROOT/new.key\"";
  const struct { const char* output; int status; bool replaced; } cases[] = {
      {kWhole, 1, false}, {":", 0, false}, {kWhole, 0, true}};
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.output) + ", exit " + std::to_string(c.status));
    TempDeviceRoot root;
    const std::string key = root.Path(kServerKeyPath);
    ASSERT_TRUE(MakeRequest(key, root.Path("/old.csr"), "/CN=old"));
    ASSERT_TRUE(MakeRequest(root.Path("/new.key"), root.Path("/new.csr"), "/CN=new"));
    root.WriteScript("/usr/orva/bin/openssl",
                     "for arg; do\n  if [ \"$previous\" = -out ]; then " + std::string(c.output) +
                         " > \"$arg\"; fi\n  previous=$arg\ndone\nexit " +
                         std::to_string(c.status));
    const std::string old_key = ReadFile(key);
    const StoreState before = ReadStore(root);
    EXPECT_EQ(c.replaced ? 0 : -1, genKey(key.c_str(), 2048));
    EXPECT_EQ(c.replaced ? ReadFile(root.Path("/new.key")) : old_key, ReadFile(key));
    if (c.replaced) {
      EXPECT_EQ(0400, FileMode(key));
    }
    ExpectStoreWhole(root, before);
  }
}
