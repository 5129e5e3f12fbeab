#include <gtest/gtest.h>

#include "platform/webapi/api_download.h"
#include "platform/webapi/api_response.h"
#include "tests/support/test_support.h"

TEST(APIDownload, CollectsHeadersAndFileBytesOfTheCurrentRequest) {
  TempDeviceRoot root;
  root.WriteFile("/archive.zip", std::string("PK\x03\x04\0zip", 8));
  ORVA::DownloadCollector collector;
  {
    ORVA::APIDownload download;
    download.SetHeader("content-disposition", "attachment; filename=\"archive.zip\"");
    ASSERT_TRUE(download.Output(root.Path("/archive.zip")));
  }
  const ORVA::DownloadResult& result = collector.result();
  ASSERT_TRUE(result.has_body);
  EXPECT_EQ(std::string("PK\x03\x04\0zip", 8), result.body);
  ASSERT_EQ(1u, result.headers.size());
  EXPECT_EQ("content-disposition", result.headers[0].first);
}

TEST(APIDownload, OutputFailsWithoutFileOrRequest) {
  TempDeviceRoot root;
  root.WriteFile("/f", "x");
  ORVA::APIDownload outside;
  EXPECT_FALSE(outside.Output(root.Path("/f")));
  ORVA::DownloadCollector collector;
  ORVA::APIDownload download;
  EXPECT_FALSE(download.Output(root.Path("/missing")));
  EXPECT_FALSE(collector.result().has_body);
}

TEST(APIResponse, EncodesSuccessAndError) {
  ORVA::APIResponse response;
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, response.outcome());
  response.SetError(5503, Json::Value());
  Json::Value error = response.ToJson();
  EXPECT_FALSE(error["success"].asBool());
  EXPECT_EQ(5503, error["error"]["code"].asInt());
  response.SetSuccess(Json::Value(Json::objectValue));
  Json::Value success = response.ToJson();
  EXPECT_TRUE(success["success"].asBool());
  EXPECT_TRUE(success["data"].isObject());
}
