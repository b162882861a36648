#include "host_check.h"

#include <algorithm>
#include <cctype>

namespace web {
namespace {

std::string Lower(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::tolower(c); });
    return text;
}

bool IsLoopback(const std::string& host) { return host == "localhost" || host == "::1" || host.rfind("127.", 0) == 0; }

}  // namespace

HostCheck::HostCheck(const std::string& listenHost, const std::vector<std::string>& allowedNames) {
    names_.insert(Lower(listenHost.find(':') != std::string::npos ? "[" + listenHost + "]" : listenHost));
    if (IsLoopback(listenHost)) names_.insert("localhost");
    for (const auto& name : allowedNames) names_.insert(Lower(name));
}

// A browser sends the port unless it is the scheme's default.
bool HostCheck::Allows(const std::string& host) const {
    const int port = port_;
    if (port < 0) return false;
    const std::string suffix = ":" + std::to_string(port);
    const std::string lower = Lower(host);
    if (lower.size() > suffix.size() && lower.compare(lower.size() - suffix.size(), suffix.size(), suffix) == 0) {
        return names_.count(lower.substr(0, lower.size() - suffix.size())) != 0;
    }
    return port == 80 && names_.count(lower) != 0;
}

}  // namespace web
