#include "sandbox.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <numeric>
#include <sstream>

#include "fileindex/json.h"
#include "log_capture.h"
#include "qira_sim/appliance.h"

namespace testkit {

void Sandbox::SetUp() {
    char tmpl[] = "/tmp/fileindex-test-XXXXXX";
    ASSERT_NE(mkdtemp(tmpl), nullptr);
    root_ = tmpl;
    setenv("QIRA_ROOT", root_.c_str(), 1);
    ASSERT_TRUE(qira_sim::InitAppliance(root_));
    MakeDir(root_ + "/volume1");
    ClearError();
    ClearLog();
}

void Sandbox::TearDown() {
    std::error_code error;
    std::filesystem::remove_all(root_, error);
    unsetenv("QIRA_ROOT");
}

std::string Sandbox::ShareDir(const std::string& name) const { return root_ + "/volume1/" + name; }

std::string Sandbox::AddShare(const std::string& name, const Json::Value& props) {
    const std::string dir = ShareDir(name);
    MakeDir(dir);
    qira_sim::PutShare(name, dir, props);
    return dir;
}

std::string Sandbox::QueueOf(const std::string& share) const {
    return ShareDir(share) + "/@eaDir/QIRA@file_index_queue";
}

void Sandbox::MakeDir(const std::string& path) const {
    std::error_code error;
    std::filesystem::create_directories(path, error);
}

std::string ReadFile(const std::string& path) {
    std::ifstream in(path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

void WriteFile(const std::string& path, const std::string& content) { std::ofstream(path, std::ios::trunc) << content; }

void AppendFile(const std::string& path, const std::string& content) {
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    ASSERT_EQ(write(fd, content.data(), content.size()), static_cast<ssize_t>(content.size()));
    close(fd);
}

bool Exists(const std::string& path) {
    struct stat st;
    return lstat(path.c_str(), &st) == 0;
}

Json::Value ParseJson(const std::string& text) {
    Json::Value value;
    if (!QIRA::FILEINDEX::fromString(value, text)) ADD_FAILURE() << "not JSON: " << text;
    return value;
}

Json::Value J(const std::string& text) { return ParseJson(text); }

mode_t ModeOf(const std::string& path) {
    struct stat st;
    return lstat(path.c_str(), &st) == 0 ? st.st_mode : 0;
}

size_t OpenDescriptors() {
    const auto fds = std::filesystem::directory_iterator("/proc/self/fd");
    return static_cast<size_t>(std::distance(begin(fds), end(fds)));
}

size_t CountOf(const std::string& text, const std::string& needle) {
    size_t count = 0;
    for (size_t at = text.find(needle); at != std::string::npos; at = text.find(needle, at + 1)) ++count;
    return count;
}

std::vector<Json::Value> ReadJsonLines(const std::string& path) {
    std::vector<Json::Value> records;
    std::stringstream lines(ReadFile(path));
    std::string line;
    while (std::getline(lines, line)) records.push_back(ParseJson(line));
    return records;
}

std::vector<std::string> JournalOps() {
    std::vector<std::string> ops;
    for (const auto& entry : qira_sim::Journal()) {
        std::string text = entry["op"].asString();
        for (const auto& arg : entry["args"]) {
            if (arg.isString()) text += " " + arg.asString();
            else if (arg.isIntegral()) text += " " + std::to_string(arg.asInt64());
        }
        ops.push_back(text);
    }
    return ops;
}

std::vector<size_t> AppliedSlices(const std::string& daemonLog, const std::string& share) {
    const std::string marker = "fileindexd-ref: share " + share + ": ";
    std::vector<size_t> slices;
    for (size_t at = daemonLog.find(marker); at != std::string::npos; at = daemonLog.find(marker, at + 1)) {
        char* end = nullptr;
        const unsigned long count = std::strtoul(daemonLog.c_str() + at + marker.size(), &end, 10);
        if (std::strncmp(end, " records applied", 16) == 0) slices.push_back(count);  // not "records not applied"
    }
    return slices;
}

size_t RecordsApplied(const std::string& daemonLog, const std::string& share) {
    const std::vector<size_t> slices = AppliedSlices(daemonLog, share);
    return std::accumulate(slices.begin(), slices.end(), size_t{0});
}

}  // namespace testkit

void Json::PrintTo(const Json::Value& value, std::ostream* os) { *os << QIRA::FILEINDEX::toString(value); }
