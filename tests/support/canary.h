// A file outside the share whose content, mode and modification time must not change.
#pragma once

#include <sys/stat.h>

#include <string>

#include <gtest/gtest.h>

#include "sandbox.h"

namespace testkit {

class Canary {
public:
    explicit Canary(const std::string& path) : path_(path) {
        WriteFile(path_, "canary");
        chmod(path_.c_str(), 0600);
        stat(path_.c_str(), &before_);
    }
    void ExpectUntouched() const {
        struct stat now;
        ASSERT_EQ(lstat(path_.c_str(), &now), 0) << path_;
        EXPECT_EQ(ReadFile(path_), "canary");
        EXPECT_EQ(now.st_mode, before_.st_mode);
        EXPECT_EQ(now.st_mtim.tv_sec, before_.st_mtim.tv_sec);
        EXPECT_EQ(now.st_mtim.tv_nsec, before_.st_mtim.tv_nsec);
    }

private:
    std::string path_;
    struct stat before_;
};

}  // namespace testkit
