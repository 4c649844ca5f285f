// What a background process keeps of its starter's descriptors: who waits for the starter must not
// wait for the work.

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <filesystem>

#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

void goOn(APIRequest*, APIResponse* own, void*) {
  own->SetSuccess();
  sleep(30);
}

/// Tells whether the descriptor that `arg` points to is open, and writes to it.
void useDescriptor(APIRequest*, APIResponse* own, void* arg) {
  const int descriptor = *static_cast<int*>(arg);
  own->SetSuccess(fcntl(descriptor, F_GETFD) >= 0 && write(descriptor, "x", 1) == 1);
}

/// What becomes of a stream that the method had open when the work opens a file of its own.
struct Stream {
  int descriptor;
  std::string file;
};

void writeToOldStream(APIRequest*, APIResponse* own, void* arg) {
  const auto* stream = static_cast<const Stream*>(arg);
  const int file = open(stream->file.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  struct stat info {};
  Json::Value data;
  data["written"] = write(stream->descriptor, "x", 1) == 1;
  data["closesOnExec"] = fcntl(stream->descriptor, F_GETFD) == FD_CLOEXEC;
  data["fileIsEmpty"] = fstat(file, &info) == 0 && info.st_size == 0;
  own->SetSuccess(data);
}

class PollingPipes : public PollingTest {
 protected:
  void SetUp() override {
    PollingTest::SetUp();
    polling->SetRemoveAttr(false);
  }

  void TearDown() override {
    const int worker = JsonHelper::asInt(JsonHelper::member(tasks->Record("alice", "id1"), "pid"));
    if (worker > 0) {
      kill(worker, SIGKILL);
    }
    PollingTest::TearDown();
  }

  /// A child with the writing end alone starts a task and dies without an answer.
  void StartInChild(const int (&ends)[2]) {
    const pid_t child = Fork([&] {
      close(ends[0]);
      polling->Start(response.get(), goOn, nullptr);
      kill(getpid(), SIGKILL);
    });
    close(ends[1]);
    EXPECT_EQ(EndOf(child), SIGKILL);
  }

  /// Whether a reader sees the end of what others write, while the work goes on.
  bool EndsSoon(int reader) const {
    pollfd entry{reader, POLLIN, 0};
    char byte = 0;
    const bool ends = ::poll(&entry, 1, 5000) == 1 && read(reader, &byte, 1) == 0;
    return ends && kill(JsonHelper::asInt(tasks->Record("alice", "id1")["pid"]), 0) == 0;
  }

  /// What the work answers that a descriptor of the starter's was given to.
  Json::Value Use(int descriptor) {
    EXPECT_TRUE(polling->Start(response.get(), useDescriptor, &descriptor));
    JoinChild();
    return Property("alice", "id1", "body")["data"];
  }
};

TEST_F(PollingPipes, ToTheStartersParentAreClosed) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  StartInChild(ends);
  EXPECT_TRUE(EndsSoon(ends[0]));
  close(ends[0]);
}

TEST_F(PollingPipes, ToTheStartersParentAreClosedWhenTheyAreSockets) {
  int ends[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
  StartInChild(ends);
  EXPECT_TRUE(EndsSoon(ends[0]));
  close(ends[0]);
}

TEST_F(PollingPipes, ThatAreCutOffKeepTheirNumberAndSwallowWhatIsWritten) {
  for (const int flags : {0, O_CLOEXEC}) {
    int ends[2];
    ASSERT_EQ(pipe2(ends, flags), 0);
    close(ends[0]);
    tasks->nextId = "id" + std::to_string(flags);
    Stream stream{ends[1], std::filesystem::path(tasks->directory).parent_path() / "p.file"};
    EXPECT_TRUE(polling->Start(response.get(), writeToOldStream, &stream));
    JoinChild();
    const Json::Value data = Property("alice", tasks->nextId, "body")["data"];
    EXPECT_EQ(data["written"], true) << flags;
    EXPECT_EQ(data["fileIsEmpty"], true) << flags;
    EXPECT_EQ(data["closesOnExec"], flags == O_CLOEXEC) << flags;
    close(ends[1]);
  }
}

TEST_F(PollingPipes, ThatAreCutOffKeepTheirNumberWhenTheyAreSockets) {
  const pid_t maker = Fork([&] {
    int sockets[2];
    socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets);
    const pid_t child = fork();
    if (child == 0) {
      Stream stream{sockets[1], std::filesystem::path(tasks->directory).parent_path() / "p.file"};
      polling->Start(response.get(), writeToOldStream, &stream);
      while (wait(nullptr) > 0) {
      }
      _exit(0);
    }
    waitpid(child, nullptr, 0);
    char byte = 0;
    _exit(recv(sockets[0], &byte, 1, MSG_DONTWAIT) == 1 ? 1 : 0);
  });
  int status = -1;
  EXPECT_EQ(waitpid(maker, &status, 0), maker);
  EXPECT_EQ(status, 0) << "what was written arrived";
  const Json::Value data = Property("alice", "id1", "body")["data"];
  EXPECT_EQ(data["written"], true);
  EXPECT_EQ(data["fileIsEmpty"], true);
}

TEST_F(PollingPipes, BetweenStarterAndWorkStayOpen) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  EXPECT_EQ(Use(ends[1]), true);
  char byte = 0;
  EXPECT_EQ(read(ends[0], &byte, 1), 1);
  EXPECT_EQ(byte, 'x');
  close(ends[0]);
  close(ends[1]);
}

TEST_F(PollingPipes, BetweenStarterAndWorkStayOpenWhenTheyAreSockets) {
  int ends[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
  EXPECT_EQ(Use(ends[1]), true);
  close(ends[0]);
  close(ends[1]);
}

TEST_F(PollingPipes, WithANameAndFilesStayOpen) {
  const std::string front = std::filesystem::path(tasks->directory).parent_path() / "p";
  const int file = open((front + ".file").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  EXPECT_EQ(Use(file), true);
  close(file);
  const std::string fifo = front + ".fifo";
  ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
  const pid_t reader = Fork([&] {
    const int end = open(fifo.c_str(), O_RDONLY | O_CLOEXEC);
    char byte = 0;
    _exit(read(end, &byte, 1) == 1 ? 0 : 1);
  });
  const int writer = open(fifo.c_str(), O_WRONLY | O_CLOEXEC);  // waits for the reader
  tasks->nextId = "id2";
  int descriptor = writer;
  EXPECT_TRUE(polling->Start(response.get(), useDescriptor, &descriptor));
  int status = -1;
  EXPECT_EQ(waitpid(reader, &status, 0), reader);
  EXPECT_EQ(status, 0);
  JoinChild();
  EXPECT_EQ(Property("alice", "id2", "body")["data"], true);
  close(writer);
  unlink(fifo.c_str());
}

}  // namespace
}  // namespace QELO
