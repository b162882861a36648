// fileindex-web: the management console, a web page and JSON API over libfileindex.
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <iostream>
#include <thread>

#include <httplib.h>

#include "api.h"
#include "appliance_root.h"
#include "captured_log.h"
#include "cli.h"
#include "fileindex/fileindex.h"
#include "token.h"

namespace {

// The page's files: installed beside the binary (../share/fileindex/web), else the source tree's.
std::string StaticDirectory(const char* argv0) {
    char self[4096];
    const ssize_t length = readlink("/proc/self/exe", self, sizeof self - 1);
    if (length > 0) {
        std::string dir(self, static_cast<size_t>(length));
        dir = dir.substr(0, dir.rfind('/')) + "/../share/fileindex/web";
        struct stat st;
        if (stat((dir + "/index.html").c_str(), &st) == 0) return dir;
    }
    (void)argv0;
    return FILEINDEX_WEB_SOURCE_STATIC;
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
    app.add_option("--listen", listen, "Address and port to listen on (port 0: any free port)");
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
        std::cerr << "fileindex-web: cannot read or make the token " << tokenFile << "\n";
        return 1;
    }

    // SIGTERM and SIGINT stop the server from a thread of their own.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGTERM);
    sigaddset(&stopSignals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);
    signal(SIGPIPE, SIG_IGN);

    httplib::Server server;
    server.set_payload_max_length(64 * 1024);
    // Enough workers that idle or slow connections cannot take them all; each waits 3 s at most.
    server.new_task_queue = [] { return new httplib::ThreadPool(48); };
    server.set_read_timeout(3, 0);
    server.set_keep_alive_timeout(3);
    server.set_write_timeout(5, 0);
    server.set_keep_alive_max_count(20);
    server.set_default_headers({{"X-Content-Type-Options", "nosniff"},
                                {"Content-Security-Policy", "default-src 'self'"},
                                {"Cache-Control", "no-store"}});
    web::AddApiRoutes(server, token);
    server.set_mount_point("/", StaticDirectory(argv[0]));
    const int bound = port == 0 ? server.bind_to_any_port(host) : (server.bind_to_port(host, port) ? port : -1);
    if (bound < 0) {
        std::cerr << "fileindex-web: cannot listen on " << listen << "\n";
        return 1;
    }
    if (created) {
        std::cout << "fileindex-web: made a token for writes (kept in " << tokenFile << "): " << token << "\n";
    } else {
        std::cout << "fileindex-web: the token for writes is in " << tokenFile << "\n";
    }
    std::cout << "fileindex-web: listening on http://" << host << ":" << bound << "/" << std::endl;
    std::thread stopper([&] {
        int signal = 0;
        sigwait(&stopSignals, &signal);
        server.stop();
    });
    server.listen_after_bind();
    pthread_kill(stopper.native_handle(), SIGTERM);
    stopper.join();
    std::cout << "fileindex-web: stopped" << std::endl;
    return 0;
}
