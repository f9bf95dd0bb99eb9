// The panel's HTTP server: the gate in front of everything, the API, the page compiled into the
// binary, and the headers every answer carries. Nothing else is served: no file is read from disk.
#ifndef FILEINDEX_PANEL_SERVER_H
#define FILEINDEX_PANEL_SERVER_H

#include <memory>
#include <string>

#include <httplib.h>

#include "gate.h"
#include "listen_address.h"
#include "status_feed.h"

namespace fileindex_panel {

class PanelServer {
public:
    // token: the panel's token; address: where it listens (port 0: any free port, set by Bind).
    PanelServer(const std::string &token, const ListenAddress &address);

    // Binds the listening socket; address() then holds the bound port. False when it cannot.
    bool Bind();
    // Answers requests until Stop; false when listening failed.
    bool Run();
    // Ends Run from another thread.
    void Stop();

    const ListenAddress &address() const { return m_address; }

private:
    ListenAddress m_address;
    std::string m_token;
    httplib::Server m_server;
    std::unique_ptr<Gate> m_gate;
    StatusFeed m_feed;
};

}  // namespace fileindex_panel

#endif
