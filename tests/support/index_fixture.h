// An appliance with two shares, a listening fake daemon and helpers for the index manager tests.
#pragma once

#include <memory>

#include "fileindex/root.h"
#include "fake_daemon.h"
#include "fileindex/json.h"
#include "log_capture.h"
#include "qira_sim/appliance.h"
#include "sandbox.h"

namespace testkit {

class IndexFixture : public Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        music_ = AddShare("music");
        photo_ = AddShare("photo");
        for (const char* dir : {"/a", "/a/b", "/b", "/c"}) {
            MakeDir(music_ + dir);
            MakeDir(photo_ + dir);
        }
        daemon_ = std::make_unique<FakeDaemon>(QIRA::FILEINDEX::DaemonSocketPath());
    }
    void TearDown() override {
        daemon_.reset();
        Sandbox::TearDown();
    }
    Json::Value Conf() { return Exists(FolderConf()) ? ParseJson(ReadFile(FolderConf())) : Json::Value(); }
    std::vector<Json::Value> Queue(const std::string& share) { return ReadJsonLines(QueueOf(share)); }
    std::vector<Json::Value> Messages() { return daemon_->Messages(); }
    // No platform call was made and no command reached the daemon.
    bool NothingSent() { return qira_sim::Journal().empty() && Messages().empty(); }
    // Forget what set-up steps did to the journal, the log and the daemon.
    void Settle() {
        qira_sim::ClearJournal();
        ClearLog();
        ClearError();
        if (daemon_) daemon_->Drain();
    }

    std::string music_;
    std::string photo_;
    std::unique_ptr<FakeDaemon> daemon_;
};

}  // namespace testkit
