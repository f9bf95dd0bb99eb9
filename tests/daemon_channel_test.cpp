// Commands to the indexing daemon: the frame on the wire, and a sender that never hangs or dies
// because the daemon is missing or goes away.
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>

#include "fileindex/utils.h"
#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/sandbox.h"
#include "tests/support/syscall_faults.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class DaemonChannelTest : public SandboxTest {};

std::string LengthPrefix(uint32_t length)
{
    return std::string(reinterpret_cast<const char *>(&length), sizeof(length));
}

TEST_F(DaemonChannelTest, OneFramePerConnectionByteForByte)
{
    FrameListener daemon;
    Json::Value data;
    data["folder_path"] = "/photo/caf\xe9\xff";
    ASSERT_TRUE(SendCammandToDaemon("upsert_folder_setting", data));
    ASSERT_TRUE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));

    const std::vector<std::string> connections = daemon.Connections(2);
    ASSERT_EQ(connections.size(), 2u);
    const std::string first = "{\"data\":{\"folder_path\":\"/photo/caf\xe9\xff\"},\"type\":\"upsert_folder_setting\"}";
    EXPECT_EQ(connections[0], LengthPrefix(first.size() + 1) + first + std::string(1, '\0'));
    const std::string second = "{\"data\":{},\"type\":\"resume\"}";
    EXPECT_EQ(connections[1], LengthPrefix(second.size() + 1) + second + std::string(1, '\0'));
}

TEST_F(DaemonChannelTest, LongCommandIsWrittenInPiecesOfAtMost1024Bytes)
{
    FrameListener daemon;
    Json::Value data;
    const std::string path = "/photo/" + std::string(5000, 'x');
    data["folder_path"] = path;
    SocketWriteRecorder writes;
    ASSERT_TRUE(SendCammandToDaemon("upsert_folder_setting", data));
    const std::string text = FrameListener::TextOfFrame(daemon.Connections(1).at(0));
    EXPECT_EQ(text, "{\"data\":{\"folder_path\":\"" + path + "\"},\"type\":\"upsert_folder_setting\"}");

    const std::vector<size_t> sizes = writes.Sizes();
    ASSERT_GE(sizes.size(), 6u);
    EXPECT_EQ(sizes[0], 4u) << "the length goes first, on its own";
    size_t total = 0;
    for (size_t i = 1; i < sizes.size(); ++i) {
        EXPECT_LE(sizes[i], 1024u);
        total += sizes[i];
    }
    EXPECT_EQ(total, text.size() + 1);
}

TEST_F(DaemonChannelTest, MissingDaemonFailsAtOnce)
{
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));

    // A socket file left behind by a daemon that died refuses the connection just as fast.
    const int stale = socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    strcpy(address.sun_path, FILEINDEX_DAEMON_SOCKET_PATH);
    ASSERT_EQ(bind(stale, reinterpret_cast<sockaddr *>(&address), sizeof(address)), 0);
    close(stale);
    EXPECT_FALSE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(100));
}

TEST_F(DaemonChannelTest, DaemonThatHangsUpGivesFalseAndTheCallerSurvives)
{
    Json::Value data;
    data["folder_path"] = std::string(1 << 20, 'x');  // more than the socket buffer holds
    bool sent = true;
    {
        FrameListener daemon(FrameListener::Mode::kCloseAtOnce);
        sent = SendCammandToDaemon("upsert_folder_setting", data);
        daemon.Connections(1);
    }
    EXPECT_FALSE(sent);
    struct sigaction action;
    sigaction(SIGPIPE, nullptr, &action);
    EXPECT_EQ(action.sa_handler, SIG_IGN) << "SIGPIPE stays ignored after the call";
}

TEST_F(DaemonChannelTest, StandInDaemonRecordsEachCommandAsOneLine)
{
    const std::string output = HostPath("/tmp/commands.jsonl");
    Child daemon([&output](const Child::Ready &ready) {
        ready();
        execl(FILEINDEX_STANDIN_DAEMON, FILEINDEX_STANDIN_DAEMON, "--output", output.c_str(), "--count", "2",
              static_cast<char *>(nullptr));
        _exit(127);
    });
    for (int i = 0; i < 500 && !stdfs::exists(FILEINDEX_DAEMON_SOCKET_PATH); ++i) {
        usleep(10000);
    }
    Json::Value data;
    data["share_name"] = "photo";
    ASSERT_TRUE(SendCammandToDaemon("revive_share_worker", data));
    data = Json::Value();
    data["resume_time"] = Json::Int64(-1);
    ASSERT_TRUE(SendCammandToDaemon("pause", data));
    EXPECT_EQ(daemon.Wait(), 0);
    EXPECT_EQ(ReadFile(output),
              "{\"data\":{\"share_name\":\"photo\"},\"type\":\"revive_share_worker\"}\n"
              "{\"data\":{\"resume_time\":-1},\"type\":\"pause\"}\n");
}

}  // namespace
}  // namespace fileindex_test
