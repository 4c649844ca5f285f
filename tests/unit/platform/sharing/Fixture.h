#pragma once

#include <ctime>
#include <string>

#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Sharing.h"

/// Links of alice's in a private root.
class SharingLinks : public PrivateRoot {
 protected:
  static constexpr char kDatabase[] = "var/lib/webapi/sharing.db";
  static constexpr char kOther[] = "198.51.100.9";  ///< an address
  static constexpr char kNoSecret[] = "AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA";

  static Json::Value Parse(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(QELO::JsonHelper::fromString(text, value)) << text;
    return value;
  }

  /// A link of the project "files" with these terms.
  static Json::Value Make(const std::string& terms = "{}", const std::string& owner = "alice") {
    Json::Value all = Parse(terms);
    all["project"] = "files";
    Json::Value link;
    EXPECT_EQ(QELO::sharing::CreateLink(owner, all, link), QELO::sharing::LINK_DONE) << terms;
    return link;
  }
  static QELO::sharing::LinkResult Change(const Json::Value& link, const std::string& terms,
                                          const std::string& owner = "alice") {
    return QELO::sharing::ChangeLink(owner, link["id"].asInt64(), Parse(terms), changed);
  }
  static QELO::sharing::LinkResult Open(const Json::Value& link, const std::string& password = "",
                                        const std::string& address = kAddress) {
    visit = Json::Value();
    return QELO::sharing::OpenLink(link["link"].asString(), password, address, visit);
  }
  /// The id of a session for a link.
  static std::string SessionFor(const Json::Value& link, const std::string& address = kAddress) {
    EXPECT_EQ(Open(link, "", address), QELO::sharing::LINK_DONE);
    return visit["sid"].asString();
  }
  static int Ask(const Json::Value& link, const std::string& sid,
                 const std::string& address = kAddress, long long size = 0) {
    const QeloSharingVisit call{address.c_str(), size};
    return QeloSharingIsAuthorized(link["link"].asCString(), sid.empty() ? nullptr : sid.c_str(),
                                   &call);
  }
  /// Runs SQL in the database as another program would.
  static void Execute(const std::string& sql);

  inline static Json::Value visit;    ///< of the last Open()
  inline static Json::Value changed;  ///< by the last Change()
};
