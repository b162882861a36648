// Commands to fileindexd: frames on the wire and the chunked writer.
#include "testkit.h"

#include "daemon_channel.h"

namespace {

class DaemonChannelTest : public testkit::Sandbox {};

TEST_F(DaemonChannelTest, FrameIsLengthThenJsonThenNulOnTheSocketUnderTheRoot) {
    auto daemon = std::make_unique<testkit::FakeDaemon>(DaemonSocketPath());
    ASSERT_TRUE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));
    const auto frames = daemon->Drain();
    ASSERT_EQ(frames.size(), 1u);
    const std::string text = "{\"data\":{},\"type\":\"resume\"}";
    EXPECT_EQ(frames[0].length, text.size() + 1);
    EXPECT_EQ(frames[0].payload, text + std::string(1, '\0'));
    EXPECT_EQ(DaemonSocketPath(), Path("/var/run/fileindexd.sock"));
    unsetenv("QIRA_ROOT");
    EXPECT_EQ(DaemonSocketPath(), "/var/run/fileindexd.sock");
    setenv("QIRA_ROOT", root().c_str(), 1);
    // No daemon, or a file that is not a socket: the call fails.
    daemon.reset();
    EXPECT_FALSE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));
    testkit::WriteFile(DaemonSocketPath(), "not a socket");
    EXPECT_FALSE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));
}

// A socket path of sizeof(sun_path) - 1 bytes is reached; one byte more fails cleanly, even with
// a daemon listening at the path it would be cut to.
TEST_F(DaemonChannelTest, SocketPathsFitSunPathExactly) {
    const size_t tail = std::string("/var/run/fileindexd.sock").size();
    for (const size_t length : {sizeof(sockaddr_un::sun_path) - 1, sizeof(sockaddr_un::sun_path)}) {
        SCOPED_TRACE(length);
        const std::string longRoot = root() + "/" + std::string(length - tail - root().size() - 1, 'r');
        MakeDir(longRoot + "/var/run");
        setenv("QIRA_ROOT", longRoot.c_str(), 1);
        ASSERT_EQ(DaemonSocketPath().size(), length);
        const bool fits = length < sizeof(sockaddr_un::sun_path);
        testkit::FakeDaemon daemon(DaemonSocketPath());
        EXPECT_EQ(SendCammandToDaemon("resume", Json::Value(Json::objectValue)), fits);
        EXPECT_EQ(daemon.Messages().size(), fits ? 1u : 0u);
        setenv("QIRA_ROOT", root().c_str(), 1);
    }
}

// A socket pair whose reading side records pieces as the writer produced them.
TEST(ChunkedWriterTest, LargeMessageGoesInPiecesOfAtMost1024) {
    int pair[2];
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_SEQPACKET, 0, pair), 0);
    const std::string text(2001, 'x');
    ASSERT_TRUE(detail::WriteChunked(pair[0], text.data(), text.size()));
    close(pair[0]);
    std::vector<size_t> pieces;
    char buffer[4096];
    ssize_t got;
    while ((got = read(pair[1], buffer, sizeof buffer)) > 0) pieces.push_back(static_cast<size_t>(got));
    close(pair[1]);
    EXPECT_EQ(pieces, (std::vector<size_t>{1024, 977}));
    EXPECT_TRUE(detail::WriteChunked(-1, "", 0));  // empty buffer succeeds at once
    // A failed first write never reads before the buffer.
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, pair), 0);
    close(pair[1]);
    signal(SIGPIPE, SIG_IGN);
    const std::string small(100, 'x');
    EXPECT_FALSE(detail::WriteChunked(pair[0], small.data(), small.size()));
    close(pair[0]);
}

}  // namespace
