#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "tests/support/FakePlatform.h"
#include "tests/unit/model/request/Fixture.h"
#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Sharing.h"

using namespace QELO;

namespace {

const char kEmptyRecord[] =
    R"({"attr":{},"cookie":{},"environ":{},"param":{},"private":{"requestMethod":0},)"
    R"("reqLib":{},"session":{},"url":{},"userAgent":{}})";

std::string content(APIRequest& request) {
  return JsonHelper::toString(request.Serialize());
}

}  // namespace

TEST(RequestConstruction, GivesEmptySectionsForAnythingButANonEmptyObject) {
  for (const char* init : {"{}", "null", "[]", "[{\"environ\":{}}]", "\"environ\"", "1"}) {
    APIRequest request(json(init));
    EXPECT_EQ(content(request), kEmptyRecord) << init;
  }
}

TEST(RequestConstruction, TakesEveryMember) {
  APIRequest request(json(R"({
      "environ": {"REQUEST_METHOD": "POST", "HTTP_COOKIE": "id=abc"},
      "getParam": {"api": "A", "version": 2, "method": "get"}, "postParam": {"x": [1]},
      "reqLib": {"minVersion": 1}, "session": {"username": "alice"}, "other": {"y": 1}})"));
  EXPECT_EQ(request.GetRequestMethod(), APIRequest::METHOD_POST);
  EXPECT_EQ(request.GetSessionID(), "abc");
  EXPECT_EQ(request.GetAPIClass(), "A");
  EXPECT_EQ(request.GetAPIVersion(), 2);
  EXPECT_EQ(request.GetAPIMethod(), "get");
  EXPECT_EQ(request.GetParam("x"), json("[1]"));
  EXPECT_EQ(request.GetAPIInfo("minVersion"), Json::Value(1));
  EXPECT_EQ(request.GetLoginUserName(), "alice");
  EXPECT_FALSE(request.Serialize().isMember("other"));
}

TEST(RequestInitEnv, DropsMembersThatAreNoStrings) {
  const APIRequest request(json(R"({"environ":{"NUMBER":1,"LIST":[],"TEXT":"x"}})"));
  EXPECT_FALSE(request.HasEnv("NUMBER"));
  EXPECT_FALSE(request.HasEnv("LIST"));
  EXPECT_TRUE(request.HasEnv("TEXT"));
  EXPECT_EQ(request.GetEnv("TEXT"), Json::Value("x"));
  EXPECT_EQ(request.GetEnv("NUMBER", "default"), Json::Value("default"));
}

TEST(RequestInitEnv, MergesIntoWhatIsThere) {
  APIRequest request(json(R"({"environ":{"A":"1","B":"1"}})"));
  request.InitEnv(json(R"({"B":"2","C":"2"})"));
  EXPECT_EQ(request.GetEnv("A"), Json::Value("1"));
  EXPECT_EQ(request.GetEnv("B"), Json::Value("2"));
  EXPECT_EQ(request.GetEnv("C"), Json::Value("2"));
}

TEST(RequestInitParam, PostWinsOverGetAndOtherNamesStay) {
  APIRequest request(json(R"({
      "getParam": {"api": "G", "version": 1, "method": "g", "a": 1, "b": 1},
      "postParam": {"api": "P", "b": 2}})"));
  EXPECT_EQ(request.GetParam("a"), Json::Value(1));
  EXPECT_EQ(request.GetParam("b"), Json::Value(2));
  EXPECT_EQ(request.GetAPIClass(), "P");
  EXPECT_EQ(request.GetAPIVersion(), 1);
  EXPECT_EQ(request.GetAPIMethod(), "g");
}

TEST(RequestInitParam, ReplacesOrMergesAsAsked) {
  APIRequest request(json(R"({"getParam":{"api":"A","a":1}})"));
  request.InitParam(json(R"({"postParam":{"b":2}})"), false);
  EXPECT_EQ(request.GetParam(""), json(R"({"api":"A","a":1,"b":2})"));
  request.InitParam(json(R"({"getParam":{"c":3}})"), true);
  EXPECT_EQ(request.GetParam(""), json(R"({"c":3})"));
  EXPECT_EQ(request.GetAPIClass(), "A");
  request.InitParam(Json::Value(), true);
  EXPECT_EQ(request.GetParam(""), json("{}"));
}

TEST(RequestInitParam, IgnoresSectionsThatAreNoObjects) {
  for (const char* section : {"null", "[]", "[1]", "\"api=x\"", "1", "true"}) {
    APIRequest request;
    Json::Value params;
    params["getParam"] = json(section);
    params["postParam"] = json(R"({"a":1})");
    request.InitParam(params, false);
    EXPECT_EQ(request.GetParam(""), json(R"({"a":1})")) << section;
  }
}

TEST(RequestInitParam, ReadsApiVersionAndMethodInTheirOwnForms) {
  const APIRequest request(json(R"({"getParam":{"api":12,"version":"3","method":true}})"));
  EXPECT_EQ(request.GetAPIClass(), "12");
  EXPECT_EQ(request.GetAPIVersion(), 3);
  EXPECT_EQ(request.GetAPIMethod(), "true");
  EXPECT_EQ(request.GetParam("version"), Json::Value("3"));
}

TEST(RequestInitParam, UnreadableApiVersionAndMethodReplaceTheOldOnesWithNothing) {
  APIRequest request(json(R"({"getParam":{"api":"A","version":1,"method":"m"}})"));
  request.InitParam(json(R"({"getParam":{"api":[],"version":"x","method":{"a":1}}})"), false);
  EXPECT_EQ(request.GetAPIClass(), "");
  EXPECT_EQ(request.GetAPIVersion(), 0);
  EXPECT_EQ(request.GetAPIMethod(), "");
}

TEST(RequestInitAPIInfo, ReplacesTheWholeDescription) {
  APIRequest request(json(R"({"reqLib":{"a":1}})"));
  request.InitAPIInfo(json(R"({"b":[2]})"));
  EXPECT_EQ(request.GetAPIInfo("a", "default"), Json::Value("default"));
  EXPECT_EQ(request.GetAPIInfo("b"), json("[2]"));
}

TEST(RequestInitSession, ReplacesTheWholeSession) {
  APIRequest request(json(R"({"session":{"username":"alice","isAdmin":true}})"));
  request.InitSession(json(R"({"username":"bob"})"));
  EXPECT_EQ(request.GetLoginUserName(), "bob");
  EXPECT_FALSE(request.IsAdmin());
}

TEST(RequestAccessors, GiveTheDefaultForAMissingName) {
  const APIRequest request;
  const Json::Value def("default");
  EXPECT_FALSE(request.HasEnv("x"));
  EXPECT_EQ(request.GetEnv("x", def), def);
  EXPECT_FALSE(request.HasParam("x"));
  EXPECT_EQ(request.GetParam("x", def), def);
  EXPECT_EQ(&request.GetParamRef("x", def), &def);
  EXPECT_FALSE(request.HasCookie("x"));
  EXPECT_EQ(request.GetCookie("x", "default"), "default");
  EXPECT_FALSE(request.HasAttr("x"));
  EXPECT_EQ(request.GetAttr("x", def), def);
  EXPECT_EQ(request.GetAPIInfo("x", def), def);
  EXPECT_EQ(request.GetAPIClass(), "");
  EXPECT_EQ(request.GetAPIVersion(), 0);
  EXPECT_EQ(request.GetAPIMethod(), "");
  EXPECT_EQ(request.GetSessionID(), "");
  EXPECT_EQ(request.GetRemoteIP(), "");
  EXPECT_FALSE(request.IsDemoMode());
}

TEST(RequestGetParamRef, RefersIntoTheStore) {
  APIRequest request(json(R"({"getParam":{"a":[1]}})"));
  EXPECT_EQ(&request.GetParamRef("a", Json::Value()), &request.Serialize()["param"]["a"]);
}

TEST(RequestHasParam, CountsANullParameterAsSent) {
  const APIRequest request(json(R"({"getParam":{"a":null}})"));
  EXPECT_TRUE(request.HasParam("a"));
  EXPECT_EQ(request.GetParam("a", "default"), Json::Value());
}

TEST(RequestSetCookie, StoresTextUnderANonEmptyName) {
  APIRequest request;
  EXPECT_TRUE(request.SetCookie("id", "x"));
  EXPECT_FALSE(request.SetCookie("", "y"));
  EXPECT_EQ(request.GetSessionID(), "x");
  EXPECT_TRUE(request.HasCookie("id"));
}

TEST(RequestSetAttr, StoresAnyValueUnderANonEmptyName) {
  APIRequest request;
  EXPECT_TRUE(request.SetAttr("a", json(R"({"b":[1]})")));
  EXPECT_FALSE(request.SetAttr("", 1));
  EXPECT_TRUE(request.HasAttr("a"));
  EXPECT_EQ(request.GetAttr("a"), json(R"({"b":[1]})"));
}

TEST(RequestRemoteIP, IsTheOneGatheredWithTheEnvironment) {
  const APIRequest request(json(R"({"environ":{"QELO_REMOTE_IP":"192.0.2.1"}})"));
  EXPECT_EQ(request.GetRemoteIP(), "192.0.2.1");
}

TEST(RequestPollingTask, NeedsBothTaskIdAndTaskUser) {
  EXPECT_TRUE(APIRequest(json(R"({"environ":{"task_id":"1","task_user":"a"}})")).IsPollingTask());
  EXPECT_FALSE(APIRequest(json(R"({"environ":{"task_id":"1"}})")).IsPollingTask());
  EXPECT_FALSE(APIRequest(json(R"({"environ":{"task_user":"a"}})")).IsPollingTask());
}

TEST(RequestPollingTask, FullTaskIdIsEmptyWhenMissing) {
  EXPECT_EQ(APIRequest().GetPollingTaskId(), "");
  EXPECT_EQ(APIRequest(json(R"({"environ":{"full_task_id":"a_1"}})")).GetPollingTaskId(), "a_1");
}

TEST(RequestUpload, IsAMultipartFormInSmallLetters) {
  const auto isUpload = [](const std::string& type) {
    APIRequest request;
    Json::Value env;
    env["CONTENT_TYPE"] = type;
    request.InitEnv(env);
    return request.IsUploadRequest();
  };
  EXPECT_TRUE(isUpload("multipart/form-data; boundary=x"));
  EXPECT_TRUE(isUpload("x multipart/form-data"));
  EXPECT_FALSE(isUpload("MULTIPART/FORM-DATA; boundary=x"));
  EXPECT_FALSE(isUpload("multipart/mixed"));
  EXPECT_FALSE(isUpload(""));
  EXPECT_FALSE(APIRequest().IsUploadRequest());
}

TEST(RequestUpload, IsASliceByItsHeaderInAnyCase) {
  for (const char* name : {"SLICEUPLOAD", "sliceupload", "SliceUpload"}) {
    Json::Value init;
    init["environ"]["HTTP_X_TYPE_NAME"] = name;
    init["environ"]["CONTENT_TYPE"] = "MULTIPART/FORM-DATA";
    const APIRequest request(init);
    EXPECT_TRUE(request.IsSliceUploadRequest()) << name;
    EXPECT_TRUE(request.IsUploadRequest()) << name;
  }
  EXPECT_FALSE(
      APIRequest(json(R"({"environ":{"HTTP_X_TYPE_NAME":"SLICE"}})")).IsSliceUploadRequest());
  EXPECT_FALSE(APIRequest().IsSliceUploadRequest());
}

TEST(RequestAccessToken, IsNullWithoutOne) {
  EXPECT_EQ(APIRequest().GetQeloAccessTokenID(), nullptr);
  EXPECT_EQ(APIRequest(json(R"({"environ":{"qeloAccessToken":""}})")).GetQeloAccessTokenID(),
            nullptr);
}

TEST(RequestAccessToken, IsPutIntoTheProcessEnvironmentAndReturnedFromThere) {
  setenv("qeloAccessToken", "old", 1);
  const char* token = nullptr;
  {
    const APIRequest request(json(R"({"environ":{"qeloAccessToken":"secret"}})"));
    token = request.GetQeloAccessTokenID();
  }
  EXPECT_STREQ(token, "secret");
  EXPECT_EQ(token, getenv("qeloAccessToken"));
  unsetenv("qeloAccessToken");
}

TEST(RequestPreferenceDir, IsWhatThePlatformSays) {
  FakePlatform::Reset().preferenceDir = "/home/alice/preferences";
  const APIRequest request(json(R"({"session":{"username":"alice"}})"));
  EXPECT_EQ(request.GetPreferenceDir(), "/home/alice/preferences");
  EXPECT_EQ(request.GetGroupPreferenceDir("staff"), "/home/alice/preferences");
  EXPECT_EQ(FakePlatform::Get().calls,
            (std::vector<std::string>{"QELOUserPreferenceDirGet(alice)",
                                      "QELOGroupPreferenceDirGet(staff)"}));
}

TEST(RequestPreferenceDir, IsWhatThePlatformSaysWithAResultOfZeroToo) {
  FakePlatform::Reset().preferenceResult = 0;
  const APIRequest request;
  EXPECT_EQ(request.GetPreferenceDir(), "/fake/preferences");
  EXPECT_EQ(request.GetGroupPreferenceDir("staff"), "/fake/preferences");
}

TEST(RequestPreferenceDir, IsTmpWithANegativeResultWhateverWasFilledIn) {
  FakePlatform::Reset().preferenceResult = -1;
  const APIRequest request;
  EXPECT_EQ(request.GetPreferenceDir(), "/tmp");
  EXPECT_EQ(request.GetGroupPreferenceDir("staff"), "/tmp");
}

TEST(RequestPreferenceDir, IsTmpWhenThePlatformFails) {
  FakePlatform::Reset().preferenceDir = "";
  const APIRequest request;
  EXPECT_EQ(request.GetPreferenceDir(), "/tmp");
  EXPECT_EQ(request.GetGroupPreferenceDir("staff"), "/tmp");
}

TEST(RequestTransport, DeserializeGivesTheOldStateBackAndTakesTheNew) {
  APIRequest request(json(R"({"getParam":{"a":1}})"));
  APIRequest other(json(R"({"getParam":{"api":"B","b":2},"session":{"username":"bob"}})"));
  Json::Value record = other.Serialize();
  request.Deserialize(record);
  EXPECT_EQ(request.GetAPIClass(), "B");
  EXPECT_EQ(request.GetLoginUserName(), "bob");
  EXPECT_EQ(content(request), content(other));
  EXPECT_EQ(record["param"], json(R"({"a":1})"));
}

TEST(RequestTransport, SurvivesTheWayThroughText) {
  APIRequest request(fullRequest());
  Json::Value record;
  ASSERT_TRUE(JsonHelper::fromString(JsonHelper::toString(request.Serialize()), record));
  APIRequest rebuilt;
  rebuilt.Deserialize(record);
  EXPECT_EQ(answers(rebuilt), answers(request));
}

TEST(RequestCopy, AnswersEveryGetterLikeTheOriginal) {
  FakePlatform::Reset();
  const APIRequest request(fullRequest());
  const APIRequest copy(request);
  EXPECT_EQ(answers(copy), answers(request));
}

TEST(RequestCopy, HasAStoreOfItsOwn) {
  APIRequest request(fullRequest());
  APIRequest copy(request);
  copy.SetAttr("only", "here");
  EXPECT_FALSE(request.HasAttr("only"));
}

TEST(RequestConstruction, TakesPostParametersAlone) {
  const APIRequest request(json(R"({"postParam":{"api":"A","x":1}})"));
  EXPECT_EQ(request.GetAPIClass(), "A");
  EXPECT_EQ(request.GetParam("x"), Json::Value(1));
}

TEST(RequestConstruction, TakesTheEnvironmentBeforeTheParameters) {
  FakePlatform::Reset().sharingGood = true;
  Json::Value init = json(R"({"getParam":{"__cIpHeRtExT":"broken"}})");
  init["environ"][SZ_X_SHARING_HEADER] = "link";
  const APIRequest request(init);
  EXPECT_EQ(
      FakePlatform::Get().calls,
      (std::vector<std::string>{"EntryDB::GetByHash(link)", "SessionDB::GetBySessionId()",
                                "TokenDB::GetBySessionEntry()", "QeloCgiDecryptParam(broken)"}));
}

TEST(RequestInitParam, PostWinsOverGetForVersionAndMethodToo) {
  const APIRequest request(json(R"({"getParam": {"api": "G", "version": 1, "method": "g"},
                                    "postParam": {"version": 2, "method": "p"}})"));
  EXPECT_EQ(request.GetAPIClass(), "G");
  EXPECT_EQ(request.GetAPIVersion(), 2);
  EXPECT_EQ(request.GetAPIMethod(), "p");
}

TEST(RequestInitParam, TakesItsOwnParametersAsTheNewOnes) {
  APIRequest request(
      json(R"({"getParam":{"old":1,"getParam":{"a":1,"postParam":5},"postParam":{"b":2}}})"));
  const Json::Value def;
  request.InitParam(request.GetParamRef("", def), true);
  EXPECT_EQ(request.GetParam(""), json(R"({"a":1,"b":2,"postParam":5})"));
}

TEST(RequestInitParam, MergesItsOwnParametersAsTheyWereBefore) {
  APIRequest request(
      json(R"({"getParam":{"getParam":{"postParam":{"c":3}},"postParam":{"b":2}}})"));
  const Json::Value def;
  request.InitParam(request.GetParamRef("", def), false);
  EXPECT_EQ(request.GetParam("b"), Json::Value(2));
  EXPECT_FALSE(request.HasParam("c"));
}

TEST(RequestInitAPIInfo, EmptyDescriptionClearsTheOldOne) {
  APIRequest request(json(R"({"reqLib":{"a":1}})"));
  request.InitAPIInfo(Json::Value(Json::objectValue));
  EXPECT_EQ(request.GetAPIInfo(""), json("{}"));
}

TEST(RequestInitSession, EmptySessionClearsTheOldOne) {
  APIRequest request(json(R"({"session":{"username":"alice"}})"));
  request.InitSession(Json::Value(Json::objectValue));
  EXPECT_EQ(request.GetLoginUserName(), "");
  EXPECT_EQ(request.Serialize()["session"], json("{}"));
}

TEST(RequestCopy, TakesTheAttributes) {
  APIRequest request;
  request.SetAttr("a", json("[1]"));
  EXPECT_EQ(APIRequest(request).GetAttr("a"), json("[1]"));
}

TEST(RequestTransport, DeserializeKeepsUrlAttributesAndUserAgent) {
  Json::Value record = json(R"({"attr":{"a":1},"environ":{"HTTP_HOST":"other"},
      "url":{"initialized":true,"urlHost":"nas"},"userAgent":{"initialized":true,"x":true}})");
  APIRequest request;
  request.Deserialize(record);
  EXPECT_EQ(request.GetURLHost("-"), "nas");
  EXPECT_EQ(request.GetAttr("a"), Json::Value(1));
  EXPECT_EQ(request.Serialize()["userAgent"], json(R"({"initialized":true,"x":true})"));
}
