#pragma once

#include <gtest/gtest.h>

#include <string>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Sharing.h"

/// The value of a JSON text.
inline Json::Value json(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(QELO::JsonHelper::fromString(text, value)) << text;
  return value;
}

/// A log message with its line number, the first number there is, written as "N".
inline std::string lineAsN(const std::string& message) {
  const size_t start = message.find_first_of("0123456789");
  const size_t end = message.find_first_not_of("0123456789", start);
  return start == std::string::npos ? message
                                    : message.substr(0, start) + "N" + message.substr(end);
}

/// A request with these CGI variables: an object's text.
inline QELO::APIRequest requestWithEnv(const std::string& variables) {
  Json::Value init;
  init["environ"] = json(variables);
  return QELO::APIRequest(init);
}

/// A request with these parameters: an object's text.
inline QELO::APIRequest requestWithParams(const std::string& params) {
  Json::Value init;
  init["getParam"] = json(params);
  return QELO::APIRequest(init);
}

/// What a request with something in every place is built from.
inline Json::Value fullRequest() {
  Json::Value init = json(R"({
    "environ": {"HTTP_COOKIE": "id=abc;sharing_sid=sid", "REQUEST_METHOD": "POST",
                "HTTPS": "on", "HTTP_HOST": "nas:5001", "REQUEST_URI": "/webapi/entry.cgi?x=1",
                "QELO_REMOTE_IP": "192.0.2.1", "CONTENT_TYPE": "multipart/form-data",
                "task_id": "7", "task_user": "alice", "full_task_id": "alice_7"},
    "getParam": {"api": "A", "version": 3, "method": "get", "x": [1, {"y": null}]},
    "reqLib": {"allowUser": ["admin.local"]},
    "session": {"username": "alice", "isAdmin": true, "isSkipCheckIP": false, "isTimeout": false,
                "timeout": 60, "isAuthorized": true, "sessFile": "/f", "app": "app",
                "webapi": "priv", "uiLang": "ger", "tokenEnable": true, "appPriv": "app",
                "authResult": 1}})");
  init["environ"][SZ_X_SHARING_HEADER] = "share";
  return init;
}

/// What the getters of a request answer, one after the other.
inline std::string answers(const QELO::APIRequest& request) {
  Json::Value all(Json::arrayValue);
  for (const std::string& text : {request.GetAPIClass(),
                                  request.GetAPIMethod(),
                                  request.GetSessionID(),
                                  request.GetRemoteIP(),
                                  request.GetUILanguage(),
                                  request.GetSessionFilePath(),
                                  request.GetApplication(),
                                  request.GetWebAPIPriv(),
                                  request.GetLoginUserName(),
                                  request.GetPreferenceDir(),
                                  request.GetGroupPreferenceDir("g"),
                                  request.GetPollingTaskId(),
                                  request.GetURLProto("-"),
                                  request.GetURLHost("-"),
                                  request.GetURLPath("-"),
                                  request.GetURLName("-"),
                                  request.GetSharingURL("-"),
                                  request.GetSharingID(),
                                  request.GetSharingSID(),
                                  request.GetCookie("id", "-")}) {
    all.append(text);
  }
  for (const int number :
       {request.GetAPIVersion(), request.GetRequestMethod(), request.GetTimeoutDuration(),
        static_cast<int>(request.GetAuthResult()), request.GetAllowUser(), request.GetURLPort(-1),
        static_cast<int>(request.GetSharingURLType())}) {
    all.append(number);
  }
  for (const bool truth :
       {request.IsTokenEnable(), request.IsAdmin(), request.IsAuthorized(), request.IsSkipCheckIP(),
        request.IsTimeout(), request.HasAppPriv("app"), request.IsDemoMode(),
        request.IsPollingTask(), request.IsUploadRequest(), request.IsSliceUploadRequest(),
        request.IsSharing(), request.HasEnv("HTTPS"), request.HasParam("x"),
        request.HasCookie("id"), request.HasAttr("a")}) {
    all.append(truth);
  }
  all.append(request.GetLoginUID());
  all.append(request.GetEnv("", Json::Value()));
  all.append(request.GetParam("", Json::Value()));
  all.append(request.GetAPIInfo("", Json::Value()));
  all.append(request.GetAttr("a", "-"));
  return QELO::JsonHelper::toString(all);
}
