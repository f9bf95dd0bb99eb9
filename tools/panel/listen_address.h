// Where the panel listens, as given by --listen ADDR:PORT, and which Host headers name it.
#ifndef FILEINDEX_PANEL_LISTEN_ADDRESS_H
#define FILEINDEX_PANEL_LISTEN_ADDRESS_H

#include <string>

namespace fileindex_panel {

struct ListenAddress {
    std::string host;       // "127.0.0.1", "::1" (no brackets), "localhost", "0.0.0.0", ...
    int port = 0;           // 0 until bound when the command line asked for any free port
    bool loopback = false;  // 127.0.0.0/8, ::1 or localhost
    bool wildcard = false;  // 0.0.0.0 or ::, every address of the machine

    // "127.0.0.1:8642", "[::1]:8642": the address as a URL and a Host header write it.
    std::string Authority() const;
};

// Parses ADDR:PORT, ADDR an IPv4 or bracketed IPv6 literal or "localhost", PORT 0-65535 (0: any
// free port). False with a sentence in problem for anything else.
bool ParseListenAddress(const std::string &text, ListenAddress &address, std::string &problem);

// Whether a request's Host header names this panel: the listen address itself or localhost, with
// the bound port. On a wildcard address any IP literal counts too: a literal cannot be rebound to
// another machine the way a DNS name can.
bool IsOwnHost(const std::string &hostHeader, const ListenAddress &address);

}  // namespace fileindex_panel

#endif
