// fileindex-panel: the appliance's web page for the file index, served over HTTP on the library.
//
//   fileindex-panel [--listen ADDR:PORT] [--token-file PATH] [--allow-remote]
//
// Prints one line with the URL to open (the token in it), answers until SIGINT or SIGTERM, then
// exits 0.
#include <signal.h>

#include <atomic>
#include <chrono>
#include <iostream>
#include <string>
#include <thread>

#include <CLI/CLI.hpp>

#include "appliance_paths.h"
#include "listen_address.h"
#include "server.h"
#include "token.h"

namespace {

// Exit statuses besides 0.
constexpr int kUsage = 2;        // the command line was wrong
constexpr int kCannotServe = 1;  // the token file or the listen address cannot be used

int Complain(const std::string &sentence, int status)
{
    std::cerr << "fileindex-panel: " << sentence << "\n";
    return status;
}

}  // namespace

int main(int argc, char **argv)
{
    CLI::App app("The appliance's web page for the file index: folders, progress, pause and shares, served over "
                 "HTTP on libfileindex.",
                 "fileindex-panel");
    std::string listen = "127.0.0.1:8642";
    std::string tokenFile = FILEINDEX_PANEL_TOKEN_PATH;
    bool allowRemote = false;
    app.add_option("--listen", listen, "address and port to listen on, ADDR:PORT (port 0: any free port)")
        ->capture_default_str();
    app.add_option("--token-file", tokenFile,
                   "file holding the access token (made, mode 0600, when missing; refused when others may read "
                   "it or it is a symbolic link)")
        ->capture_default_str();
    app.add_flag("--allow-remote", allowRemote,
                 "listen on an address other than loopback; the panel speaks plain HTTP, so put it behind the "
                 "appliance's TLS proxy");
    app.set_version_flag("--version", FILEINDEX_VERSION);
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success &success) {
        return app.exit(success);
    } catch (const CLI::ParseError &error) {
        return Complain(std::string(error.what()) + " (see --help)", kUsage);
    }

    fileindex_panel::ListenAddress address;
    std::string problem;
    if (!fileindex_panel::ParseListenAddress(listen, address, problem)) {
        return Complain(problem, kUsage);
    }
    if (!address.loopback && !allowRemote) {
        return Complain("--listen " + listen + " is reachable from other machines; give --allow-remote to mean it "
                        "(and put the panel behind the appliance's TLS proxy)", kUsage);
    }
    std::string token;
    if (!fileindex_panel::LoadOrCreateToken(tokenFile, token, problem)) {
        return Complain(problem, kCannotServe);
    }

    // SIGINT and SIGTERM are taken by a thread of their own, which stops the server: every other
    // thread, the server's included, starts with them blocked.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGINT);
    sigaddset(&stopSignals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    fileindex_panel::PanelServer server(token, address);
    if (!server.Bind()) {
        return Complain("cannot listen on " + listen + ": the port may be in use, or the address is not this "
                        "machine's", kCannotServe);
    }
    if (!address.loopback) {
        std::cerr << "fileindex-panel: warning: listening on " << server.address().Authority()
                  << " without TLS: the token and every answer cross the network in clear text; put the panel "
                     "behind the appliance's TLS proxy\n";
    }
    std::cout << "http://" << server.address().Authority() << "/?token=" << token << std::endl;

    std::atomic<bool> finished(false);
    std::thread stopper([&server, &stopSignals, &finished]() {
        int signal = 0;
        sigwait(&stopSignals, &signal);
        // A signal that came before the server ran is not lost: stop until it has ended.
        while (!finished) {
            server.Stop();
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
    });
    const bool served = server.Run();
    finished = true;
    if (!served) {
        // Listening failed before any signal: end the waiting thread.
        pthread_kill(stopper.native_handle(), SIGTERM);
    }
    stopper.join();
    return served ? 0 : Complain("listening on " + listen + " stopped with an error", kCannotServe);
}
