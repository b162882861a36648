// Abstract base of the locked JSON configuration files.
#pragma once

#include "fileindex/export.h"

#include <string>

#include <json/value.h>

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT Config {
public:
    Config();
    virtual ~Config();
    Config(const Config&) = delete;
    Config& operator=(const Config&) = delete;

    virtual bool Load() = 0;
    virtual bool Save() = 0;
    virtual std::string GetLockPath() const = 0;
    virtual std::string GetPath() const = 0;

    // A missing file is an empty configuration; an unreadable or invalid one sets error 6.
    bool LoadJson();
    // Replaces the file atomically and gives it mode 0644; a failed write sets error 7.
    bool SaveJson();
    // Three non-blocking attempts 0-9 ms apart; error 9 when the lock stays held. The lock file
    // is opened without following a symbolic link and must be a regular file. Unlike the
    // original design, which kept them open, the descriptor of each failed attempt is closed, so
    // contention leaks nothing.
    bool Lock(bool exclusive);
    void Unlock();

protected:
    Json::Value body;
    int lock_fd;
};

}  // namespace FILEINDEX
}  // namespace QIRA
