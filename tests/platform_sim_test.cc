// The simulated appliance behaves like the platform where Linux has the behaviour.
#include "testkit.h"

#include "qira/qira_share.h"
#include "qira/qlib_core.h"
#include "qira/qlib_service.h"

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

// A fault fails its call with its number, only for its argument, and, when armed by another call
// with its argument, only after that call.
TEST_F(PlatformSimTest, FaultsFailOnlyTheirArgumentAndWaitForTheirTrigger) {
    AddShare("music");
    AddShare("photo");
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
    EXPECT_STREQ(QLIBCErrorGetFile(), "sim/QIRAShareGet");
    ASSERT_EQ(QIRAShareGet("photo", &share), 0);
    EXPECT_EQ(std::string(share->szPath), ShareDir("photo"));
    QIRAShareFree(share);
    EXPECT_LT(QLIBServiceStop("fileindexd", 1), 0);
    EXPECT_EQ(qira_sim::Faults()["QLIBServiceRestart"], J(R"({"err": 35})"));  // others untouched
    qira_sim::ClearFaults();
    ASSERT_EQ(QIRAShareGet("music", &share), 0);
    QIRAShareFree(share);
}

}  // namespace
