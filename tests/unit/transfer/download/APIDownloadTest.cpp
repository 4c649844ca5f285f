#include "webapi/APIDownload.h"

#include <gtest/gtest.h>

#include "tests/support/FakePlatform.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/runner/execution/StandardStreams.h"

namespace QELO {
namespace {

using Calls = std::vector<std::string>;

constexpr char kJsonType[] =
    "HTTPFileOutputer::AddHeader(Content-type: application/json; charset=\"UTF-8\")";

class Download : public testing::Test {
 protected:
  Download() : platform_(&FakePlatform::Reset()), response_(&request_) { SyslogCapture::Clear(); }

  static std::string Header(const std::string& line) {
    return "HTTPFileOutputer::AddHeader(" + line + ")";
  }
  static std::string Output(const std::string& call) {
    return "HTTPFileOutputer::Output(" + call + ")";
  }
  Json::Value& Headers() { return response_.Serialize()["headers"]; }

  FakePlatform* platform_;
  APIRequest request_;
  APIResponse response_;
};

TEST_F(Download, FileWithoutATypeHasTheTypeOfItsName) {
  APIDownload download(&response_);
  EXPECT_EQ(download.Output("/a/b.png"), 0);
  EXPECT_EQ(platform_->calls, (Calls{kJsonType, Output("/a/b.png, type/of-/a/b.png")}));
}

TEST_F(Download, StreamWithoutATypeIsAnOctetStream) {
  APIDownload download(&response_);
  EXPECT_EQ(download.Output(stdin), 0);
  EXPECT_EQ(platform_->calls, (Calls{kJsonType, Output("stream, , application/octet-stream")}));
}

TEST_F(Download, TypeThatWasSetCountsForBoth) {
  APIDownload download(&response_);
  download.SetMimeType("text/csv");
  download.Output("/a/b.png");
  download.Output(stdin);
  EXPECT_EQ(platform_->calls, (Calls{kJsonType, Output("/a/b.png, text/csv"), kJsonType,
                                     Output("stream, , text/csv")}));
}

TEST_F(Download, TypeFromAFileNameIsTheOutputers) {
  APIDownload download(&response_);
  download.SetMimeTypeFromFileName("x.tar");
  download.Output(stdin);
  EXPECT_EQ(platform_->calls.back(), Output("stream, , type/of-x.tar"));
}

TEST_F(Download, TypeOfTheFirstFileStaysForTheNext) {
  APIDownload download(&response_);
  download.Output("a.png");
  download.Output("b.txt");
  EXPECT_EQ(platform_->calls.back(), Output("b.txt, type/of-a.png"));
}

TEST_F(Download, SetHeaderIsTheResponses) {
  APIDownload download(&response_);
  EXPECT_TRUE(download.SetHeader("X-One", "1"));
  EXPECT_FALSE(download.SetHeader("", "1"));
  EXPECT_EQ(response_.GetHeader("X-One", ""), "1");
}

TEST_F(Download, SetHeaderOfAnObjectSetsTheTextsAlone) {
  APIDownload download(&response_);
  Json::Value headers;
  headers["X-Number"] = 5;
  headers["X-Text"] = "t";
  headers["X-List"] = Json::arrayValue;
  EXPECT_TRUE(download.SetHeader(headers));
  EXPECT_FALSE(response_.HasHeader("X-Number"));
  EXPECT_FALSE(response_.HasHeader("X-List"));
  EXPECT_EQ(response_.GetHeader("X-Text", ""), "t");
}

TEST_F(Download, SetHeaderOfAnObjectStopsAtTheFirstThatCannotBeSet) {
  APIDownload download(&response_);
  Json::Value headers;
  headers[""] = "no name";  // the first in order
  headers["X-Text"] = "t";
  EXPECT_FALSE(download.SetHeader(headers));
  EXPECT_FALSE(response_.HasHeader("X-Text"));
}

TEST_F(Download, SetHeaderOfWhatIsNoObjectSetsNothing) {
  APIDownload download(&response_);
  for (const Json::Value& value : {Json::Value(), Json::Value("text"), Json::Value(5)}) {
    EXPECT_TRUE(download.SetHeader(value));
  }
  EXPECT_EQ(response_.GetHeaders().size(), 1U);
}

TEST_F(Download, HeadersArePrintedInTheirOrderWithTheStatus) {
  APIDownload download(&response_);
  response_.SetStatus(HTTP_STATUS_NOT_FOUND);
  download.SetHeader("A", "1");
  download.Output("f");
  EXPECT_EQ(platform_->calls,
            (Calls{Header("A: 1"), kJsonType, Header("Status: 404"), Output("f, type/of-f")}));
}

TEST_F(Download, HeaderThatIsNoTextIsNotPrinted) {
  Headers()["X-Number"] = 5;
  Headers()["X-Null"] = Json::Value();
  APIDownload(&response_).Output("f");
  EXPECT_EQ(platform_->calls, (Calls{kJsonType, Output("f, type/of-f")}));
}

TEST_F(Download, HeaderThatWouldBeTwoIsNotPrinted) {
  response_.SetHeader("X-Bad", "a\r\nSet-Cookie: id=1");
  APIDownload(&response_).Output("f");
  EXPECT_EQ(platform_->calls, (Calls{kJsonType, Output("f, type/of-f")}));
  EXPECT_EQ(SyslogCapture::Count("APIDownload.cpp:"), 1);
  EXPECT_EQ(SyslogCapture::Count("header X-Bad is not sent"), 1);
}

TEST_F(Download, CookiesAreNotPrinted) {
  response_.AddCookie("c", "v");
  APIDownload(&response_).Output("f");
  EXPECT_EQ(platform_->calls, (Calls{kJsonType, Output("f, type/of-f")}));
}

TEST_F(Download, WithoutAResponseItHasOneOfItsOwn) {
  for (const bool isNull : {false, true}) {
    platform_->calls.clear();
    const std::unique_ptr<APIDownload> download(isNull ? new APIDownload(nullptr)
                                                       : new APIDownload());
    EXPECT_TRUE(download->SetHeader("A", "1"));
    EXPECT_EQ(download->Output("f"), 0);
    EXPECT_EQ(platform_->calls, (Calls{Header("A: 1"), kJsonType, Output("f, type/of-f")}));
  }
}

TEST_F(Download, OutputThatPrintedTurnsTheFrameworksOff) {
  for (const int result : {0, APIDownload::kBrokenOff, 7}) {
    response_.SetEnableOutput(true);
    platform_->fileOutput = result;
    EXPECT_EQ(APIDownload(&response_).Output("f"), result);
    EXPECT_FALSE(response_.IsEnableOutput());
  }
}

TEST_F(Download, OutputThatPrintedNothingLeavesTheAnswerToTheMethod) {
  platform_->fileOutput = APIDownload::kNothingSent;
  APIDownload download(&response_);
  download.SetFileName("report.pdf");
  EXPECT_EQ(download.Output("f"), APIDownload::kNothingSent);
  EXPECT_EQ(errno, ENOENT);
  EXPECT_TRUE(response_.IsEnableOutput());
  EXPECT_FALSE(response_.HasHeader("Content-Disposition"));
}

TEST_F(Download, IsRefusedWhereTheClientIsNotAtTheOutput) {
  const StandardStreams shut(false, true);
  const StandardStreams inner(true, false);
  for (const bool isStream : {false, true}) {
    APIDownload download(&response_);
    EXPECT_EQ(isStream ? download.Output(stdin) : download.Output("f"), APIDownload::kNothingSent);
    EXPECT_EQ(errno, EPERM);
  }
  EXPECT_TRUE(response_.IsEnableOutput());
  EXPECT_EQ(platform_->calls, Calls{});
  EXPECT_EQ(SyslogCapture::Count("nothing is sent: the method's description lacks"), 2);
}

TEST_F(Download, IsSentWhereTheInputAloneIsShut) {
  const StandardStreams streams(true, false);
  EXPECT_EQ(APIDownload(&response_).Output("f"), 0);
}

TEST_F(Download, OutputThatPrintedNothingIsAnsweredWhereTheMethodHadTurnedThatOff) {
  platform_->fileOutput = APIDownload::kNothingSent;
  response_.SetEnableOutput(false);
  EXPECT_EQ(APIDownload(&response_).Output("f"), APIDownload::kNothingSent);
  EXPECT_TRUE(response_.IsEnableOutput());
}

TEST_F(Download, FileNameIsAHeaderOfTheOutput) {
  APIDownload download(&response_);
  download.SetFileName("a");
  download.Output("f");
  EXPECT_EQ(platform_->calls[1], Header("Content-Disposition: attachment:a"));
  download.SetFileName("b", true);
  download.Output(stdin);
  EXPECT_EQ(platform_->calls[4], Header("Content-Disposition: inline:b"));
}

TEST_F(Download, FastOutputIsSwitchedOffForTheProcess) {
  APIDownload download(&response_);
  EXPECT_TRUE(download.GetXSendFileEnabled());
  download.SetXSendFileDisabled();
  EXPECT_FALSE(download.GetXSendFileEnabled());
  EXPECT_FALSE(APIDownload().GetXSendFileEnabled());
}

}  // namespace
}  // namespace QELO
