// A client that takes its answer slowly, or not at all.

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <thread>

#include "tests/unit/platform/fileoutput/Fixture.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

constexpr char kTooSlow[] = "the answer broke off: the client takes it too slowly";

class SlowReader : public FileOutput {
 protected:
  void SetUp() override {
    FileOutput::SetUp();
    Write("etc/qeloinfo.conf", "download_window=1\ntransfer_least_rate=1000000\n", 0644);
    Put("large", std::string(4 << 20, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    out = UniqueFd(ends[0]);
    in = UniqueFd(ends[1]);
  }

  /// Sends the large file into the pipe.
  int SendLarge() const {
    const Redirection output(STDOUT_FILENO, in.Get());
    return HTTPFileOutputer().Output(Path("large"), "text/plain");
  }

  UniqueFd out;
  UniqueFd in;
};

TEST_F(SlowReader, WhoReadsNothingIsGivenUp) {
  EXPECT_EQ(SendLarge(), HTTPFileOutputer::kBrokenOff);
  EXPECT_EQ(SyslogCapture::Count(kTooSlow), 1);
  EXPECT_EQ(fcntl(in.Get(), F_GETFL) & O_NONBLOCK, 0);  // as it was
}

TEST_F(SlowReader, WhoReadsATrickleIsGivenUp) {
  const std::jthread client([&](const std::stop_token& ended) {
    char some[4096];
    while (!ended.stop_requested() && read(out.Get(), some, sizeof some) > 0) {
      std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
  });
  const int sent = SendLarge();
  in = UniqueFd();  // the client sees the end
  EXPECT_EQ(sent, HTTPFileOutputer::kBrokenOff);
}

TEST_F(SlowReader, WhoReadsNothingOfAStreamIsGivenUp) {
  std::FILE* endless = fopen("/dev/zero", "re");
  const Redirection output(STDOUT_FILENO, in.Get());
  EXPECT_EQ(HTTPFileOutputer().Output(endless, "", "text/plain"), HTTPFileOutputer::kBrokenOff);
  EXPECT_EQ(SyslogCapture::Count(kTooSlow), 1);
  fclose(endless);
}

TEST_F(SlowReader, WhoReadsAllIsServedOverAPipeAndASocket) {
  int pair[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair), 0);
  const UniqueFd near(pair[0]);
  const UniqueFd far(pair[1]);
  for (const auto& [from, to] : {std::pair(out.Get(), in.Get()), {far.Get(), near.Get()}}) {
    std::string got;
    std::thread client([&, from = from] {
      std::string some(100'000, '\0');
      while (got.size() < (4 << 20)) {
        got.append(some, 0, static_cast<size_t>(read(from, some.data(), some.size())));
      }
    });
    const Redirection output(STDOUT_FILENO, to);
    EXPECT_EQ(HTTPFileOutputer().Output(Path("large"), "text/plain"), 0);
    client.join();
  }
}

}  // namespace
}  // namespace QELO
