// The simulated appliance behaves like the platform where Linux has the behaviour.
#include "testkit.h"

#include "qira/qira_fs.h"
#include "qira/qira_quota.h"
#include "qira/qira_share.h"
#include "qira/qlib_core.h"
#include "qira/qlib_service.h"
#include "qiranotifyd/monitor_queue.h"

namespace {

class PlatformSimTest : public testkit::Sandbox {};

TEST_F(PlatformSimTest, FullPathBelongsToTheLongestShareDirectoryOnASlashBoundary) {
    AddShare("a");
    qira_sim::PutShare("nested", ShareDir("a") + "/inner");
    qira_sim::PutShare("ab", ShareDir("ab"));
    char name[492];
    char inside[4096];
    ASSERT_EQ(QIRAShareNamePathGet((ShareDir("a") + "/inner/x").c_str(), name, sizeof name, inside, sizeof inside), 0);
    EXPECT_STREQ(name, "nested");
    EXPECT_STREQ(inside, "/x");
    ASSERT_EQ(QIRAShareNamePathGet((ShareDir("ab") + "/y").c_str(), name, sizeof name, inside, sizeof inside), 0);
    EXPECT_STREQ(name, "ab");
    ASSERT_EQ(QIRAShareNamePathGet(ShareDir("a").c_str(), name, sizeof name, inside, sizeof inside), 0);
    EXPECT_STREQ(inside, "/");
    EXPECT_LT(QIRAShareNamePathGet("/elsewhere", name, sizeof name, inside, sizeof inside), 0);
}

TEST_F(PlatformSimTest, InjectedFaultsFailWithTheirNumberAndOnlyForTheirArgument) {
    AddShare("music");
    AddShare("photo");
    qira_sim::InjectFault("QIRAShareGet", 0x1234, "music");
    QIRASHARE* share = nullptr;
    EXPECT_LT(QIRAShareGet("music", &share), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x1234);
    EXPECT_STREQ(QLIBCErrorGetFile(), "sim/QIRAShareGet");
    ASSERT_EQ(QIRAShareGet("photo", &share), 0);
    EXPECT_EQ(std::string(share->szPath), ShareDir("photo"));
    QIRAShareFree(share);
    qira_sim::ClearFaults();
    ASSERT_EQ(QIRAShareGet("music", &share), 0);
    QIRAShareFree(share);
}

TEST_F(PlatformSimTest, FaultsAfterACallWaitForThatCallWithItsArgument) {
    AddShare("music");
    qira_sim::InjectFault("QIRAShareGet", 0x21, "music", {"QLIBServiceStart", "samba"});
    qira_sim::InjectFault("QLIBServiceStop", 0x22, "", {"QLIBServiceStart", "samba"});
    qira_sim::InjectFault("QLIBServiceRestart", 0x23);
    QIRASHARE* share = nullptr;
    ASSERT_EQ(QIRAShareGet("music", &share), 0);
    QIRAShareFree(share);
    EXPECT_EQ(QLIBServiceStart("fileindexd", 1), 0);  // another argument arms nothing
    EXPECT_EQ(QLIBServiceStop("fileindexd", 1), 0);
    EXPECT_EQ(QLIBServiceStart("samba", 1), 0);  // the call itself still passes
    EXPECT_LT(QIRAShareGet("music", &share), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x21);
    EXPECT_LT(QLIBServiceStop("fileindexd", 1), 0);
    EXPECT_EQ(qira_sim::Faults()["QLIBServiceRestart"], J(R"({"err": 35})"));  // others untouched
}

TEST_F(PlatformSimTest, StateChangingCallsAreJournalledInOrder) {
    EXPECT_EQ(QLIBServiceStart("fileindexd", 1), 0);
    EXPECT_EQ(qira_sim::ServiceState("fileindexd"), "running");
    EXPECT_EQ(QIRASMBIsEnableSpotlight(), 0);
    EXPECT_EQ(QIRASMBSetSpotlight(1), 0);
    EXPECT_EQ(QIRASMBIsEnableSpotlight(), 1);
    qira_sim::InjectFault("QLIBServiceRestart", 0x77);
    EXPECT_LT(QLIBServiceRestart("samba"), 0);
    EXPECT_EQ(QLIBServiceStop("fileindexd", 1), 0);
    const std::vector<std::string> expected = {"QLIBServiceStart fileindexd 1", "QIRASMBSetSpotlight 1",
                                               "QLIBServiceRestart samba", "QLIBServiceStop fileindexd 1"};
    EXPECT_EQ(testkit::JournalOps(), expected);
    EXPECT_EQ(qira_sim::Journal()[2]["result"].asInt(), -1);
}

TEST_F(PlatformSimTest, ProgramsRunWithoutAShellAndReportTheirExitStatus) {
    EXPECT_EQ(QLIBCExec("/bin/sh", "-c", "exit 3", nullptr, nullptr), 3);
    const std::string file = Path("/a b;c");
    testkit::WriteFile(file, "x");
    EXPECT_EQ(QLIBCExec("/bin/rm", "-f", file.c_str(), nullptr, nullptr), 0);
    EXPECT_FALSE(testkit::Exists(file));
    EXPECT_LT(QLIBCExec("/nonexistent/program", nullptr, nullptr, nullptr, nullptr), 0);
    const auto journal = qira_sim::Journal();
    ASSERT_EQ(journal.size(), 3u);
    EXPECT_EQ(journal[1]["args"][2].asString(), file);
}

TEST_F(PlatformSimTest, MonitorRegistrationsAreKeyedByQueueOwnerAndType) {
    using QIRA::QIRANOTIFYD::MonitorQueue;
    const auto type = QIRA::QIRANOTIFYD::MONITOR_QUEUE_TYPE_CUSTOM;
    MonitorQueue first(testkit::J(R"({"queue": "/q", "config": [1]})"));
    MonitorQueue second(testkit::J(R"({"queue": "/q", "config": [2]})"));
    EXPECT_TRUE(MonitorQueue::Upsert(first, "fileindex", type));
    EXPECT_TRUE(MonitorQueue::Upsert(second, "fileindex", type));
    EXPECT_TRUE(MonitorQueue::Upsert(second, "other", type));
    const auto registrations = qira_sim::Registrations();
    ASSERT_EQ(registrations.size(), 2u);
    EXPECT_EQ(registrations[0]["description"]["config"][0].asInt(), 2);
    EXPECT_TRUE(MonitorQueue::Delete("/q", "fileindex", type));
    EXPECT_EQ(qira_sim::Registrations().size(), 1u);
    EXPECT_THROW(MonitorQueue(testkit::J(R"({"queue": 5})")), std::invalid_argument);
}

TEST_F(PlatformSimTest, Utf8ComparisonIgnoresCase) {
    EXPECT_EQ(QLIBCUnicodeUTF8StrCaseCmp("Ärger", "äRGER"), 0);
    EXPECT_LT(QLIBCUnicodeUTF8StrCaseCmp("apple", "Banana"), 0);
    EXPECT_GT(QLIBCUnicodeUTF8StrCaseCmp("Zebra", "apple"), 0);
    EXPECT_LT(QLIBCUnicodeUTF8StrCaseCmp("abc", "abcd"), 0);
    EXPECT_NE(QLIBCUnicodeUTF8StrCaseCmp("\xff", "\xfe"), 0);
}

TEST_F(PlatformSimTest, QuotaFromFreeSpaceOrTheSharesCap) {
    AddShare("roomy");
    AddShare("tight", testkit::J(R"({"quota_free": 1000})"));
    EXPECT_NE(QIRAQuotaIsEnough(0, ShareDir("roomy").c_str(), 1024), 0);
    EXPECT_EQ(QIRAQuotaIsEnough(0, ShareDir("roomy").c_str(), 1ULL << 62), 0);
    EXPECT_EQ(QLIBCErrGet(), QLIBC_ERR_NO_SPACE);
    EXPECT_EQ(QIRAQuotaIsEnough(0, ShareDir("tight").c_str(), 1024), 0);
    EXPECT_EQ(QLIBCErrGet(), QLIBC_ERR_QUOTA_EXCEEDED);
}

TEST_F(PlatformSimTest, RecycleBinSnapshotsMountPointsAndTypes) {
    AddShare("s", testkit::J(R"({"fs_type": 21, "mount_points": ["/mnt/x"]})"));
    const std::string dir = ShareDir("s");
    EXPECT_EQ(QIRAShareIsShareRecycle((dir + "/#recycle/f").c_str()), 1);
    EXPECT_EQ(QIRAShareIsShareRecycle((dir + "/a/#recycle/f").c_str()), 0);
    int in = -1;
    EXPECT_EQ(QLIBFhsPathInSnapshot((dir + "/#snapshot/x").c_str(), &in), 0);
    EXPECT_EQ(in, 1);
    EXPECT_EQ(QIRAGetFSType(dir.c_str(), 0), 21);
    EXPECT_NE(QIRAFSIsRemoteFS(21), 0);
    EXPECT_EQ(QIRAGetFSType("/not/in/a/share", 0), -1);
    EXPECT_EQ(QIRAFSDirIsMntPoint(dir.c_str()), 0);
    EXPECT_EQ(QIRAFSDirIsMntPoint("/"), 1);
    EXPECT_EQ(QIRAEAIsHiddenDir("@eaDir"), 1);
    EXPECT_EQ(QIRAEAMKDir(0, (dir + "/@eaDir").c_str()), 0);
    EXPECT_EQ(QIRAEAMKDir(0, (dir + "/@eaDir").c_str()), 0);
}

TEST_F(PlatformSimTest, NotifierProgramRecordsItsArguments) {
    const std::string program = Path("/usr/qira/bin/qiralumnotify");
    EXPECT_EQ(QLIBCExec(program.c_str(), "-e", "a b", nullptr, nullptr), 0);
    qira_sim::SetNotifierExitStatus(4);
    EXPECT_EQ(QLIBCExec(program.c_str(), "x", nullptr, nullptr, nullptr), 4);
    const auto calls = qira_sim::NotifierCalls();
    ASSERT_EQ(calls.size(), 2u);
    EXPECT_EQ(calls[0], (std::vector<std::string>{"-e", "a b"}));
}

}  // namespace
