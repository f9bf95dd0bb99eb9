// The gate before every route: Host, Origin, the token as bearer header or cookie, the cookie exchange.
#include "gate.h"

#include <utility>

#include "path_encoding.h"
#include "replies.h"
#include "token.h"

namespace fileindex_panel {

namespace {

const char kPageHeader[] = "X-Fileindex-Panel";

// The value of the cookie name in a Cookie header ("a=1; b=2"), or "" when it is not there.
std::string CookieValue(const std::string &header, const std::string &name)
{
    size_t start = 0;
    while (start < header.size()) {
        size_t end = header.find(';', start);
        if (end == std::string::npos) {
            end = header.size();
        }
        std::string pair = header.substr(start, end - start);
        pair.erase(0, pair.find_first_not_of(' '));
        if (pair.compare(0, name.size() + 1, name + "=") == 0) {
            return pair.substr(name.size() + 1);
        }
        start = end + 1;
    }
    return std::string();
}

bool IsPage(const std::string &path)
{
    return path.compare(0, 5, "/api/") != 0;
}

// A Host header as a message shows it: in quotes, or, when it holds control characters or bytes
// that are not UTF-8, quoted as a shell reads it back, so that the answer stays UTF-8 and no byte of
// it can drive a terminal that prints it.
std::string QuotedHost(const std::string &host)
{
    const std::string shown = fileindex_tool::TerminalText(host);
    return shown == host ? "'" + host + "'" : shown;
}

}  // namespace

Gate::Gate(std::string token, ListenAddress address) : m_token(std::move(token)), m_address(std::move(address)) {}

std::string Gate::CookieName() const
{
    return "fileindex_panel_" + std::to_string(m_address.port);
}

bool Gate::Authenticated(const httplib::Request &request, bool &byCookie) const
{
    const std::string authorization = request.get_header_value("Authorization");
    static const std::string kBearer = "Bearer ";
    if (authorization.compare(0, kBearer.size(), kBearer) == 0) {
        byCookie = false;
        return TokenMatches(authorization.substr(kBearer.size()), m_token);
    }
    byCookie = true;
    for (size_t i = 0; i < request.get_header_value_count("Cookie"); ++i) {
        if (TokenMatches(CookieValue(request.get_header_value("Cookie", i), CookieName()), m_token)) {
            return true;
        }
    }
    return false;
}

httplib::Server::HandlerResponse Gate::Check(const httplib::Request &request, httplib::Response &response) const
{
    const std::string host = request.get_header_value("Host");
    if (!IsOwnHost(host, m_address)) {
        Refuse(response, 403, "the Host header " + QuotedHost(host) + " does not name this panel; open it at http://" +
                                   m_address.Authority() + "/");
        return httplib::Server::HandlerResponse::Handled;
    }
    const bool hasOrigin = request.has_header("Origin");
    if (hasOrigin && request.get_header_value("Origin") != "http://" + host) {
        Refuse(response, 403, "a request from another site is refused");
        return httplib::Server::HandlerResponse::Handled;
    }
    if (request.method == "GET" && IsPage(request.path) && request.has_param("token")) {
        if (!TokenMatches(request.get_param_value("token"), m_token)) {
            RefusePage(response, 401, "The token in this address is not the panel's.");
            return httplib::Server::HandlerResponse::Handled;
        }
        response.set_header("Set-Cookie", CookieName() + "=" + m_token + "; Path=/; HttpOnly; SameSite=Strict");
        response.set_redirect(request.path, 303);
        return httplib::Server::HandlerResponse::Handled;
    }
    bool byCookie = false;
    if (!Authenticated(request, byCookie)) {
        if (IsPage(request.path)) {
            RefusePage(response, 401, "This page needs the panel's token.");
        } else {
            Refuse(response, 401, "no valid token: send 'Authorization: Bearer <token>' (the token is in the panel's "
                                  "token file), or open the URL the panel printed");
        }
        return httplib::Server::HandlerResponse::Handled;
    }
    const bool changesState = request.method != "GET" && request.method != "HEAD";
    if (changesState && byCookie && !hasOrigin && !request.has_header(kPageHeader)) {
        Refuse(response, 403, "a change authenticated by the cookie needs an Origin or X-Fileindex-Panel header");
        return httplib::Server::HandlerResponse::Handled;
    }
    return httplib::Server::HandlerResponse::Unhandled;
}

}  // namespace fileindex_panel
