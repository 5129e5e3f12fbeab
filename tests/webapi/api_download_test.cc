#include <gtest/gtest.h>

#include "platform/webapi/api_download.h"
#include "tests/support/test_support.h"

TEST(APIDownload, CollectsHeadersAndFileBytesOnlyInsideARequest) {
  TempDeviceRoot root;
  const std::string zip("PK\x03\x04\0zip", 8);
  root.WriteFile("/archive.zip", zip);
  EXPECT_FALSE(ORVA::APIDownload().Output(root.Path("/archive.zip"))) << "no request is served";

  ORVA::DownloadCollector collector;
  ORVA::APIDownload download;
  EXPECT_FALSE(download.Output(root.Path("/missing")));
  EXPECT_FALSE(collector.result().has_body);
  download.SetHeader("content-disposition", "attachment; filename=\"archive.zip\"");
  ASSERT_TRUE(download.Output(root.Path("/archive.zip")));
  ASSERT_TRUE(collector.result().has_body);
  EXPECT_EQ(zip, collector.result().body);
  ASSERT_EQ(1u, collector.result().headers.size());
  EXPECT_EQ("content-disposition", collector.result().headers[0].first);
}
