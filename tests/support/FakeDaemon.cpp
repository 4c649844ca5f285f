#include "tests/support/FakePlatform.h"
#include "webapi/platform/Daemon.h"

namespace {

FakePlatform& fake() {
  return FakePlatform::Get();
}

void note(const std::string& call) {
  fake().calls.push_back(call);
}

}  // namespace

namespace qelodaemon {

SockConnection::SockConnection(int descriptor, const Limits& limits)
    : descriptor_(descriptor), limits_(limits) {}

SockConnection::~SockConnection() = default;

bool SockConnection::Send(const std::string& message) {
  note("Send()");
  fake().daemonMessage = message;
  return fake().daemonSends;
}

bool SockConnection::Recv(std::string& message) {
  note("Recv()");
  if (fake().daemonAnswers) {
    message = fake().daemonReply;
  }
  return fake().daemonAnswers;
}

DomainSockConnection::DomainSockConnection(const std::string& path, const Limits& limits)
    : SockConnection(-1, limits), path_(path) {}

DomainSockConnection::~DomainSockConnection() {
  note("Disconnect()");
}

bool DomainSockConnection::Connect() {
  note("Connect(" + path_ + ")");
  return fake().daemonConnects;
}

}  // namespace qelodaemon
