// Which configuration files an operation changed: a failure after the save leaves its change behind.
#pragma once

#include <string>
#include <vector>

namespace tools {

class SavedFiles {
public:
    // Notes the identity (inode, size, modification time) of folder.conf and status.conf.
    SavedFiles();
    // The files whose identity changed since.
    std::vector<std::string> Changed() const;

private:
    struct Identity {
        std::string path;
        std::string stamp;
    };
    static std::string StampOf(const std::string& path);
    std::vector<Identity> files_;
};

}  // namespace tools
