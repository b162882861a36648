// Test kit: a fresh simulated appliance under its own QIRA_ROOT for every test.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <json/value.h>

#include "fileindex/error.h"

namespace testkit {

class Sandbox : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    // Creates <root>/volume1/<name> and registers it as a share.
    std::string AddShare(const std::string& name, const Json::Value& props = Json::Value());
    std::string ShareDir(const std::string& name) const;
    std::string Path(const std::string& fixedPath) const { return root_ + fixedPath; }
    std::string FolderConf() const { return Path("/usr/qira/etc/fileindex/folder.conf"); }
    std::string StatusConf() const { return Path("/usr/qira/etc/fileindex/status.conf"); }
    std::string QueueOf(const std::string& share) const;
    void MakeDir(const std::string& path) const;

    const std::string& root() const { return root_; }

private:
    std::string root_;
};

// Whole file content ("" when missing) and writing one.
std::string ReadFile(const std::string& path);
void WriteFile(const std::string& path, const std::string& content);
// Appends with one write(2), as the queue's writers do.
void AppendFile(const std::string& path, const std::string& content);
bool Exists(const std::string& path);
Json::Value ParseJson(const std::string& text);
std::vector<Json::Value> ReadJsonLines(const std::string& path);

// The mode of what lies at `path`, not following a link; 0 when nothing does.
mode_t ModeOf(const std::string& path);

// Descriptors this process has open now.
size_t OpenDescriptors();

// "/d/d/.../d", `levels` components.
inline std::string Deep(int levels) { std::string path; while (levels-- > 0) path += "/d"; return path; }

// How often `needle` occurs in `text`.
size_t CountOf(const std::string& text, const std::string& needle);

// The records the daemon stand-in's log says it applied to the share's index, slice by slice
// and in all.
std::vector<size_t> AppliedSlices(const std::string& daemonLog, const std::string& share);
size_t RecordsApplied(const std::string& daemonLog, const std::string& share);

// Journal entries as "op" or "op arg1 arg2 ..." strings.
std::vector<std::string> JournalOps();

// Resets the sticky error code between steps of one test.
inline void ClearError() { QIRA::FILEINDEX::ErrorHandler::SetError(QIRA::FILEINDEX::FILEINDEX_ERR_NONE); }

// Builds a JSON value from text (test data).
Json::Value J(const std::string& text);

}  // namespace testkit

namespace Json {
// Readable values in test failure messages.
void PrintTo(const Value& value, std::ostream* os);
}  // namespace Json
