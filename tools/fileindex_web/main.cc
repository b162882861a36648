// fileindex-web: the management console, a web page and JSON API over libfileindex.
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <memory>
#include <iostream>
#include <vector>

#include "api.h"
#include "appliance_root.h"
#include "captured_log.h"
#include "cli.h"
#include "fileindex/fileindex.h"
#include "token.h"

namespace {

// The page's files: installed beside the binary (../share/fileindex/web), else the source tree's.
std::string StaticDirectory() {
    char self[4096];
    const ssize_t length = readlink("/proc/self/exe", self, sizeof self - 1);
    if (length > 0) {
        std::string dir(self, static_cast<size_t>(length));
        dir = dir.substr(0, dir.rfind('/')) + "/../share/fileindex/web";
        struct stat st;
        if (stat((dir + "/index.html").c_str(), &st) == 0) return dir;
    }
    return FILEINDEX_WEB_SOURCE_STATIC;
}

// Raises the limit of open descriptors to `count` where the hard limit allows.
void AllowDescriptors(rlim_t count) {
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) != 0 || limit.rlim_cur >= count) return;
    limit.rlim_cur = std::min(count, limit.rlim_max);
    setrlimit(RLIMIT_NOFILE, &limit);
}

bool SplitListen(const std::string& listen, std::string& host, int& port) {
    const size_t colon = listen.rfind(':');
    if (colon == std::string::npos) return false;
    host = listen.substr(0, colon);
    const std::string digits = listen.substr(colon + 1);
    if (host.empty() || digits.empty() || digits.size() > 5 || digits.find_first_not_of("0123456789") != std::string::npos) {
        return false;
    }
    port = std::stoi(digits);
    return port <= 65535;
}

}  // namespace

int main(int argc, char** argv) {
    tools::CaptureLibraryLog();
    CLI::App app{"Management console of the file-indexing service: a web page and JSON API", "fileindex-web"};
    app.set_version_flag("--version", "fileindex-web " FILEINDEX_VERSION);
    std::string listen = "127.0.0.1:8080";
    std::string root;
    std::vector<std::string> allowedHosts;
    app.add_option("--listen", listen, "Address and port to listen on (port 0: any free port)");
    app.add_option("--allow-host", allowedHosts,
                   "A name the console may be reached by besides its address (repeatable), e.g. nas.local");
    app.add_option("--root", root, "Root prefix of the appliance (instead of QIRA_ROOT)")->check(CLI::ExistingDirectory);
    if (const auto ended = tools::Parse(app, argc, argv)) return *ended;
    std::string host;
    int port = 0;
    if (!SplitListen(listen, host, port)) {
        std::cerr << "fileindex-web: --listen: give ADDRESS:PORT, e.g. 127.0.0.1:8080\n";
        return tools::kExitUsage;
    }
    if (!root.empty() && !QIRA::FILEINDEX::UseRootPrefix(root)) {
        std::cerr << "fileindex-web: --root: this build uses the appliance's own paths\n";
        return tools::kExitUsage;
    }
    if (root.empty()) tools::WarnWithoutAppliance("fileindex-web");

    const std::string configDir = QIRA::FILEINDEX::Folders().GetPath().substr(0, QIRA::FILEINDEX::Folders().GetPath().rfind('/'));
    const std::string tokenFile = configDir + "/web.token";
    bool created = false;
    const std::string token = web::LoadOrCreateToken(tokenFile, created);
    if (token.empty()) {
        std::cerr << "fileindex-web: cannot read or make the token " << tokenFile
                  << " (it must be a regular file of this user, mode 0600)\n";
        return 1;
    }

    // SIGTERM and SIGINT stop the server; the serving threads never see them.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGTERM);
    sigaddset(&stopSignals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);
    signal(SIGPIPE, SIG_IGN);

    web::ServerLimits limits;
    AllowDescriptors(limits.connections + 64);
    web::HttpServer server(limits);
    server.SetDefaultHeaders({{"X-Content-Type-Options", "nosniff"},
                              {"Content-Security-Policy",
                               "default-src 'self'; script-src 'self'; style-src 'self'; object-src 'none'; "
                               "base-uri 'none'; form-action 'self'; frame-ancestors 'none'"},
                              {"Referrer-Policy", "no-referrer"},
                              {"X-Frame-Options", "DENY"},
                              {"Cache-Control", "no-store"}});
    web::AddApiRoutes(server, {token, tokenFile});
    server.ServeFiles(StaticDirectory());
    const auto hosts = std::make_shared<web::HostCheck>(host, allowedHosts);
    web::GuardHost(server, hosts);
    const int bound = server.Listen(host, port);
    if (bound < 0) {
        std::cerr << "fileindex-web: cannot listen on " << listen << "\n";
        return 1;
    }
    hosts->SetPort(bound);
    if (created) {
        std::cout << "fileindex-web: made a token for writes (kept in " << tokenFile << "): " << token << "\n";
    } else {
        std::cout << "fileindex-web: the token for writes is in " << tokenFile << "\n";
    }
    std::cout << "fileindex-web: listening on http://" << host << ":" << bound << "/" << std::endl;
    int signal = 0;
    sigwait(&stopSignals, &signal);
    server.Stop();
    std::cout << "fileindex-web: stopped" << std::endl;
    return 0;
}
