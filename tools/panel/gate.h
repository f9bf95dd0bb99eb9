// Who may ask the panel anything: every request passes here before it is routed.
//
// In this order: a Host header that does not name the panel is refused (403, against DNS
// rebinding); an Origin header of another site is refused (403); then the token is required, as
// "Authorization: Bearer <token>" or as the session cookie (401 without either). A GET of a page
// with ?token=<token> in its URL sets the cookie (HttpOnly, SameSite=Strict) and redirects to the
// same URL without the token, so that it leaves the address bar and the history. A request that
// changes state and is authenticated by the cookie must also carry Origin, or the header the page
// sets, X-Fileindex-Panel (403 otherwise): a browser only sends the cookie, never that header, on
// its own.
#ifndef FILEINDEX_PANEL_GATE_H
#define FILEINDEX_PANEL_GATE_H

#include <string>

#include <httplib.h>

#include "listen_address.h"

namespace fileindex_panel {

class Gate {
public:
    Gate(std::string token, ListenAddress address);

    // Handled when the gate answered the request itself (refused or redirected); Unhandled lets it
    // through to the routes.
    httplib::Server::HandlerResponse Check(const httplib::Request &request, httplib::Response &response) const;

    // The session cookie's name: it carries the port, so that panels on several ports of one
    // machine keep their cookies apart.
    std::string CookieName() const;

private:
    bool Authenticated(const httplib::Request &request, bool &byCookie) const;

    std::string m_token;
    ListenAddress m_address;
};

}  // namespace fileindex_panel

#endif
