// Whatever a share's user puts in the queue, every reader returns, holds little memory and still
// reads the records that follow.
#include "testkit.h"

#include "queue_file.h"

namespace {

// Growth of the resident set over the call, in KiB, from the process's own high-water mark.
struct Measured {
    int result = -1;  // 1 true, 0 false, -1 when the call did not return
    long growthKb = 0;
};

long StatusField(const char* field) {
    std::istringstream in(testkit::ReadFile("/proc/self/status"));
    for (std::string line; std::getline(in, line);) {
        if (line.rfind(field, 0) == 0) return std::atol(line.c_str() + std::strlen(field));
    }
    return -1;
}

template <typename F>
Measured RunMeasured(F call) {
    int report[2];
    if (pipe(report) != 0) return {};
    const pid_t child = fork();
    if (child == 0) {
        alarm(120);  // a guard against a hang only
        testkit::WriteFile("/proc/self/clear_refs", "5");  // the high-water mark starts from here
        const long before = StatusField("VmRSS:");
        Measured measured{call() ? 1 : 0, 0};
        measured.growthKb = StatusField("VmHWM:") - before;
        _exit(write(report[1], &measured, sizeof measured) == sizeof measured ? 0 : 1);
    }
    close(report[1]);
    Measured measured;
    if (read(report[0], &measured, sizeof measured) != sizeof measured) measured = Measured();
    close(report[0]);
    waitpid(child, nullptr, 0);
    return measured;
}

constexpr long kMaxGrowthKb = 16 * 1024;
constexpr off_t kSparseSize = off_t{8} << 30;
constexpr size_t kLongLine = size_t{64} << 20;

class HostileQueueTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music/a": {"audio": false}})");
        MakeDir(music_ + "/@eaDir");
        queue_ = QueueOf("music");
    }
    std::string queue_;
};

struct Operation {
    const char* name;
    std::function<bool()> call;
};

const std::vector<Operation>& Operations() {
    static const std::vector<Operation> operations = {
        {"status", [] { return StatusMgr::GetFolderStatus("/music/a") == "processing"; }},
        {"listing",
         [] {
             Json::Value out;
             return IndexMgr::List(out, 0, 10, "", "", J(R"(["status"])")) &&
                    out["folder"][0]["additional"]["status"] == "processing";
         }},
        {"progress",
         [] {
             Json::Value out;
             return GetProgress(out) && out["shares"].size() == 1;
         }},
        {"explain",
         [] {
             Json::Value out;
             return ExplainPath("/music/a", out) && out["status"] == "processing";
         }},
        {"reindex", [] { return IndexMgr::Reindex(J(R"(["/music/a"])")); }},
        {"upsert", [] { return IndexMgr::Upsert(J(R"([{"path": "/music/a", "audio": true}])")); }},
    };
    return operations;
}

void ExpectEveryOperationReturnsHoldingLittleMemory() {
    for (const auto& operation : Operations()) {
        SCOPED_TRACE(operation.name);
        const Measured measured = RunMeasured(operation.call);
        EXPECT_EQ(measured.result, 1);
        EXPECT_LT(measured.growthKb, kMaxGrowthKb);
    }
}

TEST_F(HostileQueueTest, ASparseQueueIsNotReadAndItsShareIsMarked) {
    const int fd = open(queue_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    ASSERT_EQ(ftruncate(fd, kSparseSize), 0);
    close(fd);
    ExpectEveryOperationReturnsHoldingLittleMemory();
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    testkit::ClearLog();
    Json::Value progress;
    ASSERT_TRUE(GetProgress(progress));
    EXPECT_EQ(progress["shares"][0]["unread"], J(R"(["queue"])"));
    struct stat st;  // the reindex and the upsert appended their events to it
    ASSERT_EQ(stat(queue_.c_str(), &st), 0);
    EXPECT_GT(st.st_size, kSparseSize);
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"Queue not read, queue=" + queue_ + ", reason=sparse, size=" +
                                                               std::to_string(st.st_size) + ", allocated=" +
                                                               std::to_string(st.st_blocks * 512)});
}

TEST_F(HostileQueueTest, ALineOverTheLimitIsSkippedAndTheNextRecordRead) {
    // A line far over the limit, then a reindex record of the folder.
    const int fd = open(queue_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    const std::string block(1 << 20, 'x');
    for (size_t written = 0; written < kLongLine; written += block.size()) {
        ASSERT_EQ(write(fd, block.data(), block.size()), static_cast<ssize_t>(block.size()));
    }
    const std::string record = "\n{\"event\":65536,\"path\":\"" + music_ + "/a\",\"data\":null}\n";
    ASSERT_EQ(write(fd, record.data(), record.size()), static_cast<ssize_t>(record.size()));
    close(fd);
    const off_t planted = static_cast<off_t>(testkit::ReadFile(queue_).size());
    ExpectEveryOperationReturnsHoldingLittleMemory();
    testkit::ClearLog();
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");  // from the record after the line
    EXPECT_EQ(testkit::LogMessages(),
              std::vector<std::string>{"Malformed command: too long, queue=" + queue_ + ", offset=0, length=" +
                                       std::to_string(kLongLine)});
    Json::Value explained;
    ASSERT_TRUE(ExplainPath("/music/a", explained));
    EXPECT_EQ(explained["pending"]["queue"].asInt(), 1);
    // The reindex record after the line covers the events of the reindex and the upsert.
    EXPECT_EQ(static_cast<off_t>(testkit::ReadFile(queue_).size()), planted);
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("music"));
    // A line of exactly the limit is read by every reader and written by the library, one byte
    // more is neither.
    const std::string unclosed = record.substr(1, record.size() - 3);  // without its newlines and closing brace
    Json::Value event(Json::objectValue);
    event["event"] = 2;
    event["path"] = music_ + "/a/x";
    event["data"] = "";
    const size_t eventFrame = toString(event).size();
    for (const size_t length : {detail::kMaxQueueLine, detail::kMaxQueueLine + 1}) {
        SCOPED_TRACE(length);
        const bool fits = length == detail::kMaxQueueLine;
        testkit::WriteFile(queue_, unclosed + std::string(length - unclosed.size() - 1, ' ') + "}\n");
        EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), fits ? "processing" : "finished");
        ASSERT_TRUE(ExplainPath("/music/a", explained));
        EXPECT_EQ(explained["pending"]["queue"].asInt(), fits ? 1 : 0);
        size_t records = 0, malformed = 0;
        EXPECT_EQ(ReadQueueRecords(queue_, [&](const QueueRecordView&) { ++records; }, [&](off_t, size_t) { ++malformed; }),
                  QueueReading::Read);
        EXPECT_EQ(records, fits ? 1u : 0u);
        EXPECT_EQ(malformed, fits ? 0u : 1u);
        testkit::WriteFile(queue_, "");
        event["data"] = std::string(length - eventFrame, 'd');
        EXPECT_EQ(AddCustomEvent(2, music_ + "/a/x", event["data"]), fits);
        EXPECT_EQ(testkit::ReadFile(queue_), fits ? toString(event) + "\n" : "");
        EXPECT_EQ(StatusMgr::ShareIsNeedReindex("music"), !fits);
    }
}

}  // namespace
