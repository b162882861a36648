// Which Host a request may name. A page on any site whose name its owner points at 127.0.0.1
// would otherwise read the console from the administrator's browser (DNS rebinding): only the
// address the console listens on, "localhost" when that is a loopback address, and the names
// the administrator allows are answered, with the port the console listens on.
#pragma once

#include <atomic>
#include <set>
#include <string>
#include <vector>

namespace web {

class HostCheck {
public:
    HostCheck(const std::string& listenHost, const std::vector<std::string>& allowedNames);

    // The port bound; until it is set no Host is allowed.
    void SetPort(int port) { port_ = port; }

    // True when `host` (the request's Host header) names this console; names compare without case.
    bool Allows(const std::string& host) const;

private:
    std::set<std::string> names_;  // lower case; an IPv6 address in brackets
    std::atomic<int> port_{-1};
};

}  // namespace web
