// Envelopes are made by the openssl command, as examples/ciphers/envelope.sh does it: a second
// implementation of what is opened here.

#include <unistd.h>

#include <cstdio>
#include <ctime>

#include "platform/tokens/module/TokenStore.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Token.h"

namespace {

using QELO::CredRequestUtil::GetDecryptAESString;
using QELO::Platform::TokenStore;

constexpr char kLine[] = "api=QELO.X&version=1&text=%C3%A4";

std::string outputOf(const std::string& command) {
  std::string output;
  FILE* pipe = popen(command.c_str(), "r");
  for (int c = fgetc(pipe); c != EOF; c = fgetc(pipe)) {
    output += static_cast<char>(c);
  }
  EXPECT_EQ(pclose(pipe), 0) << command;
  while (!output.empty() && output.back() == '\n') {
    output.pop_back();
  }
  return output;
}

class Ciphers : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    Write("etc/webapi/cipher.pem", PrivateKey());
  }

  static const std::string& PrivateKey(const char* bits = "3072") {
    static std::map<std::string, std::string> keys;
    std::string& key = keys[bits];
    if (key.empty()) {
      key = outputOf(std::string("openssl genpkey -algorithm RSA -pkeyopt rsa_keygen_bits:") +
                     bits + " 2> /dev/null") +
            "\n";
    }
    return key;
  }

  /// @param seconds  from now on, of the maker's clock
  static std::string Make(const std::string& kind, const std::string& key, const std::string& line,
                          long seconds) {
    return outputOf("SECONDS_NOW=" + std::to_string(time(nullptr) + seconds) +
                    " " ENVELOPE_SCRIPT " " + kind + " '" + key + "' '" + line + "'");
  }
  static std::string ForHost(const std::string& line = kLine, long seconds = 0) {
    const std::string publicKey = Path("public.pem");
    EXPECT_EQ(system(("openssl pkey -pubout -in '" + Path("etc/webapi/cipher.pem") + "' -out '" +
                      publicKey + "'")
                         .c_str()),
              0);
    return Make("host", publicKey, line, seconds);
  }

  /// The text that an envelope holds; "" when it is not opened, and nothing is changed then.
  static std::string Open(std::string text) {
    const std::string before = text;
    if (QeloCgiDecryptParam(text.data()) == 0) {
      EXPECT_EQ(text, before);
      return "";
    }
    return text.c_str();
  }

  static std::string Detect(std::string line) {
    const std::string before = line;
    if (QeloCgiDetectAndDecryptParamLine(line.data()) == 0) {
      EXPECT_EQ(line, before);
      return "(failure)";
    }
    return line.c_str();
  }

  static void ForgetOpened() { remove(Path("run/webapi/ciphers/seen").c_str()); }

  /// The error for the administrator, when there was one line.
  static std::string Reason() {
    const auto& messages = SyslogCapture::Messages();
    return messages.size() == 1 ? messages[0].text : std::to_string(messages.size()) + " messages";
  }

  /// Every other character of an envelope at every place, one after the other.
  template <typename Opens>
  static void ExpectNoChangeIsOpened(const std::string& envelope, Opens opens) {
    for (size_t i = 0; i < envelope.size(); ++i) {
      for (const char c : {'A', '_'}) {
        std::string changed = envelope;
        changed[i] = c;
        if (c != envelope[i]) {
          ASSERT_FALSE(opens(changed)) << i << " " << c;
        }
      }
      std::string flipped = envelope;
      flipped[i] = static_cast<char>(flipped[i] ^ 1);
      ASSERT_FALSE(opens(flipped)) << i;
      ASSERT_FALSE(opens(envelope.substr(0, i))) << i;
    }
    for (const char* more : {"A", "=", ".", " "}) {
      ASSERT_FALSE(opens(envelope + more)) << more;
    }
    ForgetOpened();
    ASSERT_TRUE(opens(envelope));
  }
};

TEST_F(Ciphers, PlainLineIsGoodAndStays) {
  for (const char* line : {"", "api=QELO.X&version=1", "a=__cIpHeRtExT", "__ciphertext=x",
                           "x__cIpHeRtExT=x", "webapi={\"__cIpHeRtExT\":\"x\"}", "a=%41%zz"}) {
    EXPECT_EQ(Detect(line), line);
  }
  EXPECT_EQ(QeloCgiDetectAndDecryptParamLine(nullptr), 0);
  EXPECT_EQ(QeloCgiDecryptParam(nullptr), 0);
  EXPECT_NE(access(Path("run/webapi/ciphers").c_str(), F_OK), 0);
}

TEST_F(Ciphers, LineThatIsNoEnvelopeIsAFailure) {
  for (const char* line : {"__cIpHeRtExT=x", "a=b&__cIpHeRtExT=x&c=d", "__cIpHeRtExT",
                           "%5F_cIpHeRtExT=x", "__cIpHeRtExT=a.b.c.d.e"}) {
    EXPECT_EQ(Detect(line), "(failure)") << line;
  }
}

TEST_F(Ciphers, EnvelopeHoldsItsLine) {
  EXPECT_EQ(Open(ForHost()), kLine);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
  const std::string longLine = "x=" + std::string(50000, 'y');
  EXPECT_EQ(Open(ForHost(longLine)), longLine);
}

TEST_F(Ciphers, WholeLineStandsBehindWhatWasSentPlain) {
  EXPECT_EQ(Detect("__cIpHeRtExT=" + ForHost()), kLine);
  EXPECT_EQ(Detect("api=other&__cIpHeRtExT=" + ForHost() + "&b=2"),
            std::string("api=other&b=2&") + kLine);
  EXPECT_EQ(Detect("%5F_cIpHeRtExT=" + ForHost()), kLine);
}

TEST_F(Ciphers, SecondEnvelopeOfALineIsAFailure) {
  EXPECT_EQ(Detect("__cIpHeRtExT=" + ForHost() + "&__cIpHeRtExT=" + ForHost()), "(failure)");
  EXPECT_NE(Reason().find("no envelope was opened: there is more than one"), std::string::npos);
}

TEST_F(Ciphers, EnvelopeIsOpenedOnce) {
  const std::string envelope = ForHost();
  EXPECT_EQ(Open(envelope), kLine);
  EXPECT_EQ(Open(envelope), "");
  EXPECT_NE(Reason().find("it was opened before"), std::string::npos);
  EXPECT_EQ(Detect("__cIpHeRtExT=" + envelope), "(failure)");
  EXPECT_EQ(InChild([&] { return Open(envelope).empty() ? 0 : 1; }), 0);
}

TEST_F(Ciphers, EnvelopeIsGoodForSomeMinutesByEitherClock) {
  for (const long seconds : {-290L, 290L}) {
    EXPECT_EQ(Open(ForHost(kLine, seconds)), kLine) << seconds;
  }
  for (const long seconds : {-320L, 320L, -1000000000L}) {
    SyslogCapture::Clear();
    EXPECT_EQ(Open(ForHost(kLine, seconds)), "") << seconds;
    EXPECT_NE(Reason().find("it is too old, or of the future"), std::string::npos);
  }
  Set({{"cipher_window", "10"}});
  EXPECT_EQ(Open(ForHost(kLine, -30)), "");
}

TEST_F(Ciphers, ChangeAtAnyPlaceIsNotOpened) {
  Write("etc/webapi/cipher.pem", PrivateKey("2048"));
  ExpectNoChangeIsOpened(ForHost("a=1"),
                         [](const std::string& text) { return !Open(text).empty(); });
}

TEST_F(Ciphers, EnvelopeForAnotherKeyIsNotOpened) {
  const std::string envelope = ForHost();
  Write("etc/webapi/cipher.pem", PrivateKey("2048"));
  EXPECT_EQ(Open(envelope), "");
  EXPECT_NE(Reason().find("it was changed, or made for another key"), std::string::npos);
}

TEST_F(Ciphers, WeakKeyOpensNothing) {
  Write("etc/webapi/cipher.pem", PrivateKey("1536"));
  EXPECT_EQ(Open(ForHost()), "");
}

TEST_F(Ciphers, KeyIsItsOwnersAlone) {
  const std::string envelope = ForHost();
  for (const mode_t mode : {0640, 0604, 0620, 0602}) {
    ASSERT_EQ(chmod(Path("etc/webapi/cipher.pem").c_str(), mode), 0);
    SyslogCapture::Clear();
    EXPECT_EQ(Open(envelope), "") << mode;
    EXPECT_NE(Reason().find("the private key is missing"), std::string::npos);
  }
  ASSERT_EQ(remove(Path("etc/webapi/cipher.pem").c_str()), 0);
  EXPECT_EQ(Open(envelope), "");
  Write("etc/webapi/cipher.pem", "no key");
  EXPECT_EQ(Open(envelope), "");
}

TEST_F(Ciphers, WhatWasOpenedHasToBeRemembered) {
  ASSERT_EQ(mkdir(Path("run/webapi/ciphers").c_str(), 0755), 0);
  ASSERT_EQ(chmod(Path("run/webapi/ciphers").c_str(), 0755), 0);
  const std::string envelope = ForHost();
  EXPECT_EQ(Open(envelope), "");
  ASSERT_EQ(chmod(Path("run/webapi/ciphers").c_str(), 0700), 0);
  EXPECT_EQ(Open(envelope), kLine);
  EXPECT_EQ(Status("run/webapi/ciphers/seen").st_mode & 0777U, 0600U);
  EXPECT_LE(Status("run/webapi/ciphers/seen").st_size, 1 << 21);
}

TEST_F(Ciphers, MissingModuleOpensNothing) {
  const std::string envelope = ForHost();
  ASSERT_EQ(remove(Path("modules/ciphers.so").c_str()), 0);
  EXPECT_EQ(Open(envelope), "");
}

/// With an access token of alice's.
class TokenCiphers : public Ciphers {
 protected:
  void SetUp() override {
    Ciphers::SetUp();
    token_ = CreateToken(0);
  }

  std::string CreateToken(int64_t expires) {
    TokenStore store;
    TokenStore::Entry entry;
    entry.owner = {"alice", 1002, false};
    entry.scopes = {{"*", "*"}};
    entry.expires = expires;
    std::string token;
    EXPECT_TRUE(store.Open(Path("var/lib/webapi/tokens.db").c_str(), true,
                           [](const char*) { return TokenStore::kNobody; }));
    EXPECT_TRUE(store.Create(entry, token)) << store.Error();
    id_ = std::to_string(entry.id);
    return token;
  }

  static std::string KeyOf(const std::string& id) {
    char key[33] = "before";
    const int result = QELOCloudServiceZttokenGenerateToken(id.c_str(), key, sizeof key);
    EXPECT_EQ(result < 0, key[0] == '\0');
    return key;
  }

  std::string Open(const std::string& envelope) const {
    std::string plain = "before";
    const bool opened = GetDecryptAESString(KeyOf(id_), envelope, plain);
    EXPECT_TRUE(opened || plain == "before");
    return opened ? plain : "";
  }

  std::string token_;
  std::string id_;
};

TEST_F(TokenCiphers, EnvelopeHoldsItsLine) {
  EXPECT_EQ(KeyOf(id_).size(), 32U);
  EXPECT_EQ(Open(Make("token", token_, kLine, 0)), kLine);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(TokenCiphers, ChangeAtAnyPlaceIsNotOpened) {
  const std::string key = KeyOf(id_);
  ExpectNoChangeIsOpened(Make("token", token_, "a=1", 0), [&](const std::string& text) {
    std::string plain;
    return GetDecryptAESString(key, text, plain);
  });
}

TEST_F(TokenCiphers, EnvelopeIsOpenedOnceAndInTime) {
  const std::string envelope = Make("token", token_, kLine, 0);
  EXPECT_EQ(Open(envelope), kLine);
  EXPECT_EQ(Open(envelope), "");
  EXPECT_EQ(Open(Make("token", token_, kLine, -320)), "");
}

TEST_F(TokenCiphers, EnvelopeOfAnotherTokenIsNotOpened) {
  EXPECT_EQ(Open(Make("token", CreateToken(0).replace(0, 1, "#"), kLine, 0)), "");
  const std::string envelope = Make("token", token_, kLine, 0);
  EXPECT_EQ(Open(envelope), "");  // the id is the second token's by now
}

TEST_F(TokenCiphers, KindsAreNotTakenForEachOther) {
  EXPECT_EQ(Open(ForHost()), "");
  EXPECT_EQ(Ciphers::Open(Make("token", token_, kLine, 0)), "");
}

TEST_F(TokenCiphers, KeyIsThatOfAGoodToken) {
  for (const char* none : {"", "0", "-1", "7", "x", "1x", " 1", "9223372036854775808"}) {
    EXPECT_EQ(KeyOf(none), "") << none;
  }
  CreateToken(time(nullptr) + 100);
  EXPECT_NE(KeyOf(id_), "");
  CreateToken(time(nullptr) - 1);
  EXPECT_EQ(KeyOf(id_), "");
  char key[32] = "before";
  EXPECT_LT(QELOCloudServiceZttokenGenerateToken("1", key, sizeof key), 0);
  EXPECT_STREQ(key, "");
  EXPECT_LT(QELOCloudServiceZttokenGenerateToken(nullptr, key, sizeof key), 0);
  ASSERT_EQ(remove(Path("var/lib/webapi/tokens.db").c_str()), 0);
  EXPECT_EQ(KeyOf("1"), "");
}

TEST_F(TokenCiphers, EmptyKeyOpensNothing) {
  std::string plain;
  EXPECT_FALSE(GetDecryptAESString("", Make("token", token_, kLine, 0), plain));
}

}  // namespace
