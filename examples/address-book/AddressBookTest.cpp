#include <gtest/gtest.h>
#include <webapi/testing/TestHost.h>

#include <string>

namespace {

using QELO::TestAnswer;
using QELO::TestHost;

constexpr char kApi[] = "QELO.Example.AddressBook";

class AddressBook : public testing::Test {
 protected:
  AddressBook() {
    EXPECT_TRUE(host.Describe(SOURCE_DIR "/QELO.Example.AddressBook.lib.in"));
    host.AddUser("alice", 1001);
    host.AddUser("bob", 1002);
    host.LogIn("alice");
  }

  TestAnswer Call(const std::string& method, const TestHost::Params& params = {}) {
    return host.Call(kApi, 1, method, params);
  }
  Json::Int64 Add(const std::string& name) {
    const TestAnswer answer = Call("create", {{"name", name}});
    EXPECT_TRUE(answer.IsSuccess()) << answer;
    return answer.Data()["id"].asInt64();
  }
  Json::Value Import(const std::string& lines) {
    host.AddUpload("file", "people.tsv", lines);
    const TestAnswer answer = Call("import");
    EXPECT_TRUE(answer.IsSuccess()) << answer;
    return host.WaitForTask(answer.Data()["task_id"].asString());
  }
  /// The names that a list answers, with blanks between them.
  std::string Names(const TestHost::Params& params = {}) {
    std::string names;
    for (const Json::Value& person : Call("list", params).Data()) {
      names += (names.empty() ? "" : " ") + person["name"].asString();
    }
    return names;
  }

  TestHost host;
};

TEST_F(AddressBook, CreatedPersonIsFoundWithTheCallersRights) {
  const TestAnswer created =
      Call("create", {{"name", "Ann"}, {"phone", "12345"}, {"mail", "ann@example.net"}});
  EXPECT_TRUE(created.IsSuccess()) << created;
  EXPECT_EQ(created.account, "alice");
  const TestAnswer got = Call("get", {{"id", created.Data()["id"]}});
  EXPECT_EQ(got.Data(), created.Data());
  EXPECT_EQ(got.Data()["phone"], "12345");
}

TEST_F(AddressBook, PhoneArrivesAsItWasSent) {
  for (const std::string phone : {"12345", "0123", "1.50", "1e3", "null"}) {
    const TestAnswer answer = host.CallLine(kApi, 1, "create", "name=Ann&phone=" + phone);
    EXPECT_EQ(answer.Data()["phone"], phone) << answer;
  }
}

TEST_F(AddressBook, ListIsSortedSearchedAndCut) {
  Add("Eve");
  Add("Ann");
  Add("Anton");
  EXPECT_EQ(Names(), "Ann Anton Eve");
  EXPECT_EQ(Names({{"part", "nn"}}), "Ann");
  EXPECT_EQ(Names({{"limit", 2}}), "Ann Anton");
  EXPECT_EQ(Names({{"part", "'"}}), "");
}

TEST_F(AddressBook, EachUserHasABookOfTheirOwn) {
  const Json::Int64 id = Add("Ann");
  host.LogIn("bob");
  EXPECT_EQ(Names(), "");
  EXPECT_EQ(Call("get", {{"id", id}}).Code(), 401);
}

TEST_F(AddressBook, PersonIsUpdatedAndRemoved) {
  const Json::Int64 id = Add("Ann");
  EXPECT_EQ(Call("update", {{"id", id}, {"name", "Anna"}, {"phone", "1"}}).Data()["name"], "Anna");
  EXPECT_EQ(Call("get", {{"id", id}}).Data()["phone"], "1");
  EXPECT_TRUE(Call("remove", {{"id", id}}).IsSuccess());
  for (const char* method : {"get", "remove"}) {
    EXPECT_EQ(Call(method, {{"id", id}}).Code(), 401) << method;
  }
  EXPECT_EQ(Call("update", {{"id", id}, {"name", "Anna"}}).Code(), 401);
}

TEST_F(AddressBook, WhatIsWrongIsNamed) {
  const TestAnswer answer = Call("create", {{"phone", std::string(31, '1')}, {"mail", "a\nb"}});
  EXPECT_EQ(answer.Code(), 101);
  ASSERT_EQ(answer.Errors().size(), 3U) << answer;
  EXPECT_EQ(answer.Errors()[0]["path"], "/name");
  EXPECT_EQ(answer.Errors()[1]["rule"], "maxLength");
  EXPECT_EQ(answer.Errors()[2]["rule"], "pattern");
}

TEST_F(AddressBook, ImportBringsEachLine) {
  EXPECT_EQ(Import("Bob\t0123\tbob@example.net\nEve\n")["data"], 2);
  EXPECT_EQ(Names(), "Bob Eve");
  EXPECT_EQ(Call("list").Data()[0]["mail"], "bob@example.net");
}

TEST_F(AddressBook, ImportWithABadLineBringsNothing) {
  const Json::Value last = Import("Bob\n\tno name\nEve\n");
  EXPECT_EQ(last["error"]["code"], 402);
  EXPECT_EQ(last["error"]["errors"], 2);
  EXPECT_EQ(Names(), "");
}

TEST_F(AddressBook, ImportTakesOneMebibyte) {
  host.AddUpload("file", "large.tsv", std::string((1 << 20) + 1, 'x'));
  const TestAnswer answer = Call("import");
  EXPECT_EQ(answer.Code(), 101);
  EXPECT_EQ(answer.Errors()[0]["path"], "/file");
}

TEST_F(AddressBook, ExportIsAFileThatImportTakes) {
  const std::string lines = "Bob\t0123\tbob@example.net\nEve\t\t\n";
  Import(lines);
  const TestAnswer answer = Call("export");
  EXPECT_EQ(answer.body, lines);
  EXPECT_EQ(answer.Header("Content-Type"), "text/tab-separated-values");
  EXPECT_EQ(answer.Header("Content-Disposition"), "attachment; filename=\"address-book.tsv\"");
}

TEST_F(AddressBook, VisitorsHaveNone) {
  host.LogOut();
  EXPECT_EQ(Call("list").Code(), 105);
}

}  // namespace
