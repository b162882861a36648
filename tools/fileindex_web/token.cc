#include "token.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <random>

namespace web {
namespace {

std::string ReadToken(const std::string& file) {
    const int fd = open(file.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC);
    if (fd < 0) return "";
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode) || st.st_uid != geteuid() || (st.st_mode & 077) != 0) {
        close(fd);
        return "";
    }
    char buffer[128];
    const ssize_t got = read(fd, buffer, sizeof buffer - 1);
    close(fd);
    std::string token(buffer, got > 0 ? static_cast<size_t>(got) : 0);
    while (!token.empty() && (token.back() == '\n' || token.back() == ' ')) token.pop_back();
    return token;
}

std::string NewToken() {
    std::random_device random;
    std::string token;
    char hex[9];
    for (int i = 0; i < 4; ++i) {
        std::snprintf(hex, sizeof hex, "%08x", static_cast<unsigned>(random()));
        token += hex;
    }
    return token;
}

}  // namespace

std::string LoadOrCreateToken(const std::string& file, bool& created) {
    created = false;
    std::string token = ReadToken(file);
    if (!token.empty()) return token;
    token = NewToken();
    const int fd = open(file.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
    if (fd < 0) return ReadToken(file);  // made meanwhile by another start
    const std::string line = token + "\n";
    const bool written = write(fd, line.data(), line.size()) == static_cast<ssize_t>(line.size());
    close(fd);
    created = written;
    return written ? token : "";
}

bool TokenMatches(const std::string& given, const std::string& token) {
    unsigned char difference = given.size() == token.size() ? 0 : 1;
    for (size_t i = 0; i < token.size(); ++i) {
        difference |= static_cast<unsigned char>(token[i] ^ (i < given.size() ? given[i] : 0));
    }
    return difference == 0;
}

}  // namespace web
