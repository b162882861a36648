// The incremental readings of the queues give exactly the answers of a full reading, whatever
// happens to the files between two questions: appends, lines written in two pieces, takes (the
// queue renamed to its companion and a new one begun), truncations and rewrites.
#include "testkit.h"

#include <random>

#include "queue_reference.h"

namespace {

using detail::QueueAnswer;

class QueueReadingsTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        dir_ = AddShare("s");
        MakeDir(dir_ + "/@eaDir");
        queue_ = QueueOf("s");
        detail::ForgetQueueReadings();
    }
    std::string Record(std::mt19937& random) {
        static const std::vector<std::string> places = {"/a", "/a/x", "/ab", "/a/b/c", "/b", "/b/a", "", "/abc/d"};
        static const std::vector<unsigned> events = {1, 2, 8, 256, 256, 65536, 131072};
        const unsigned event = events[random() % events.size()];
        std::string line = "{\"event\":" + std::to_string(event) + ",\"path\":\"" + dir_ + places[random() % places.size()] + "\"";
        if (event == 256 && random() % 3 != 0) line += ",\"path_old\":\"" + dir_ + places[random() % places.size()] + "\"";
        return line + ",\"data\":{\"dir\":false}}";
    }
    static std::string Malformed(std::mt19937& random) {
        static const std::vector<std::string> kinds = {"{\"event\":1,\"path\":\"/v", "garbage", "{\"event\":1,\"path\":\"/v\"",
                                                       "{\"event\":1,\"path\":/v\"}", "{\"event\":tru,\"path\":\"/v\"}",
                                                       "{\"event\" 1,\"path\":\"/v\"}"};
        return kinds[random() % kinds.size()];
    }
    // One random change of the queue and its companion, as writers and the daemon make them.
    void Change(std::mt19937& random) {
        struct stat st;
        const bool queueExists = stat(queue_.c_str(), &st) == 0;
        switch (random() % 10) {
            case 0: case 1: case 2:
                testkit::AppendFile(queue_, Record(random) + "\n");
                break;
            case 3:
                testkit::AppendFile(queue_, Malformed(random) + "\n");
                break;
            case 4:  // a line written in two pieces: its first part now
                testkit::AppendFile(queue_, Record(random).substr(0, 20));
                break;
            case 5:  // the daemon takes the queue
                if (!queueExists) break;
                if (!testkit::Exists(queue_ + ".tmp")) {
                    rename(queue_.c_str(), (queue_ + ".tmp").c_str());
                } else {
                    testkit::AppendFile(queue_ + ".tmp", testkit::ReadFile(queue_));
                    unlink(queue_.c_str());
                }
                break;
            case 6:
                unlink((queue_ + ".tmp").c_str());  // the daemon is done with what it took
                break;
            case 7:
                if (queueExists) {
                    ASSERT_EQ(truncate(queue_.c_str(), static_cast<off_t>(random() % (st.st_size + 1))), 0);
                }
                break;
            case 8: {  // rewritten from the start
                std::string text;
                for (unsigned i = random() % 4; i > 0; --i) text += Record(random) + "\n";
                testkit::WriteFile(queue_, text);
                break;
            }
            default:
                for (int i = 0; i < 30; ++i) testkit::AppendFile(queue_, Record(random) + "\n");
        }
    }
    std::string dir_;
    std::string queue_;
};

TEST_F(QueueReadingsTest, AnswersEqualAFullReadingThroughEveryChange) {
    std::mt19937 random(20261124);
    std::vector<std::string> pool;
    for (const char* inside : {"/a", "/ab", "/a/b", "/b", "/abc", "/zz"}) pool.push_back(dir_ + inside + "/");
    std::vector<std::string> asked = {pool[0]};
    for (int step = 0; step < 1500; ++step) {
        SCOPED_TRACE("step " + std::to_string(step));
        Change(random);
        if (random() % 20 == 0) asked.push_back(pool[random() % pool.size()]);  // a folder asked about anew
        for (const std::string& file : {queue_, queue_ + ".tmp"}) {
            QueueAnswer incremental, full;
            const bool read = detail::ReadQueue(file, asked, incremental);
            ASSERT_EQ(read, testkit::FullReading(file, asked, full)) << file;
            if (!read) continue;
            ASSERT_EQ(incremental.lines, full.lines) << file;
            ASSERT_EQ(incremental.all, full.all) << file;
            ASSERT_EQ(incremental.under, full.under) << file;
        }
    }
}

// A reading belongs to the file, not to its name: it follows the daemon's rename to the companion,
// and a malformed line appended meanwhile is logged when first read.
TEST_F(QueueReadingsTest, AReadingIsKeptPerFileAndFollowsItsRename) {
    const std::string a = dir_ + "/a/";
    testkit::WriteFile(queue_, "{\"event\":1,\"path\":\"" + dir_ + "/a/x\"}\n");
    QueueAnswer answer;
    ASSERT_TRUE(detail::ReadQueue(queue_, {a}, answer));
    EXPECT_EQ(testkit::RecordsOf(answer.under), std::vector<unsigned long long>{1});
    ASSERT_EQ(rename(queue_.c_str(), (queue_ + ".tmp").c_str()), 0);
    testkit::ClearLog();
    testkit::AppendFile(queue_ + ".tmp", "junk\n");
    ASSERT_TRUE(detail::ReadQueue(queue_ + ".tmp", {a}, answer));  // the same file under its new name
    EXPECT_EQ(answer.lines, 2u);
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"Malformed command: junk"});
    EXPECT_GT(detail::QueueReadingsFootprint(), 0u);
    EXPECT_LT(detail::QueueReadingsFootprint(), 8192u);
}

// A long queue is read by two threads. Counting lines alone logs nothing; the first question about
// a folder logs every malformed line once and in file order, the overlong one by its place, past
// as many malformed lines as the second thread may hold; a later question logs only new lines.
TEST_F(QueueReadingsTest, ALongQueueReadInTwoPartsLogsEachMalformedLineOnceInOrder) {
    std::mt19937 random(7);
    std::string text;
    std::vector<std::string> expected;
    bool overlongWritten = false;
    const std::string padding = ",\"data\":{\"note\":\"" + std::string(300, 'n') + "\"}}";
    while (text.size() < (size_t{17} << 20)) {
        std::string line = Record(random);
        line.replace(line.rfind(",\"data\""), std::string::npos, padding);
        if (random() % 2 == 0) line = Malformed(random);
        if (!overlongWritten && text.size() > (size_t{13} << 20)) {
            line.assign(detail::kMaxQueueLine + 1, 'x');
            overlongWritten = true;
            expected.push_back("Malformed command: too long, queue=" + queue_ + ", offset=" + std::to_string(text.size()) +
                               ", length=" + std::to_string(line.size()));
        } else if (detail::QueueRecord record; !detail::ReadQueueRecordStrict(line.data(), line.data() + line.size(), record)) {
            expected.push_back("Malformed command: " + line);
        }
        text += line + "\n";
    }
    testkit::WriteFile(queue_, text);
    testkit::ClearLog();
    const std::vector<std::string> asked = {dir_ + "/a/", dir_ + "/b/"};
    QueueAnswer incremental, full;
    ASSERT_TRUE(testkit::FullReading(queue_, asked, full));
    ASSERT_TRUE(detail::ReadQueue(queue_, {}, incremental));
    EXPECT_EQ(incremental.lines, full.lines);
    EXPECT_TRUE(testkit::LogMessages().empty());
    ASSERT_TRUE(detail::ReadQueue(queue_, asked, incremental));
    EXPECT_EQ(incremental.lines, full.lines);
    EXPECT_EQ(testkit::RecordsOf(incremental.under), testkit::RecordsOf(full.under));  // files: the second part starts afresh
    ASSERT_GT(expected.size(), 2 * 16384u);
    EXPECT_EQ(testkit::LogMessages(), expected);
    testkit::ClearLog();
    testkit::AppendFile(queue_, "junk\n");
    ASSERT_TRUE(detail::ReadQueue(queue_, asked, incremental));
    EXPECT_EQ(incremental.lines, full.lines + 1);
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"Malformed command: junk"});
}

// A last line without "\n" counts for that answer only: completed, its file counts once.
TEST_F(QueueReadingsTest, ACompletedLastLineCountsItsFileOnce) {
    const auto line = [this](const char* name) { return "{\"event\":1,\"path\":\"" + dir_ + "/a/" + name + "\"}"; };
    testkit::WriteFile(queue_, line("x") + "\n" + line("y"));
    for (const char* appended : {"", "\n"}) {
        testkit::AppendFile(queue_, appended);
        QueueAnswer answer;
        ASSERT_TRUE(detail::ReadQueue(queue_, {dir_ + "/a/"}, answer));
        EXPECT_EQ(answer.all, (detail::Tally{2, 2})) << appended;
        EXPECT_EQ(answer.under[0], (detail::Tally{2, 2})) << appended;
    }
}

// The folders kept per file are bounded, but never below one question's: a question about more
// folders than the bound still gets every count.
TEST_F(QueueReadingsTest, AQuestionAboutMoreFoldersThanKeptIsAnsweredWhole) {
    std::string text;
    std::vector<std::string> asked;
    for (size_t i = 0; i < detail::kMaxFoldersPerQueue + 2; ++i) {
        asked.push_back(dir_ + "/f" + std::to_string(i) + "/");
        text += "{\"event\":1,\"path\":\"" + dir_ + "/f" + std::to_string(i) + "/x\"}\n";
    }
    testkit::WriteFile(queue_, text);
    QueueAnswer answer;
    ASSERT_TRUE(detail::ReadQueue(queue_, {asked.front()}, answer));
    ASSERT_TRUE(detail::ReadQueue(queue_, asked, answer));
    EXPECT_EQ(testkit::RecordsOf(answer.under), std::vector<unsigned long long>(asked.size(), 1));
}

}  // namespace
