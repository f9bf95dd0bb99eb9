// The HTTP server: limits, threads, headers on every answer, the gate, the API and the page.
#include "server.h"

#include <chrono>

#include "api.h"
#include "page_assets.h"
#include "replies.h"

namespace fileindex_panel {

namespace {

// Requests carry at most this much: the folder list's 1000 settings with long paths fit easily.
constexpr size_t kMaxBodyBytes = 1024 * 1024;
// Pages poll the status once a second; every poll in between gets the same reading.
constexpr auto kStatusInterval = std::chrono::milliseconds(1000);
// Threads answering requests: a handful of pages and scripts at once; library calls take turns.
constexpr size_t kThreads = 16;

const char kContentSecurityPolicy[] =
    "default-src 'self'; img-src 'self'; frame-ancestors 'none'; base-uri 'none'; form-action 'self'";

// The error a request met before any route answered it (unknown path, wrong method, too large).
void AnswerUnrouted(const httplib::Request &request, httplib::Response &response)
{
    switch (response.status) {
    case 404: Refuse(response, 404, "no such page or route: " + request.path); break;
    case 413: Refuse(response, 413, "the body is larger than 1 MiB"); break;
    default: Refuse(response, response.status, "the request could not be read"); break;
    }
}

}  // namespace

PanelServer::PanelServer(const std::string &token, const ListenAddress &address)
    : m_address(address), m_token(token), m_feed(kStatusInterval, ReadStatus)
{
    m_server.new_task_queue = [] { return new httplib::ThreadPool(kThreads); };
    m_server.set_payload_max_length(kMaxBodyBytes);
    m_server.set_default_headers({
        {"Content-Security-Policy", kContentSecurityPolicy},
        {"X-Content-Type-Options", "nosniff"},
        {"X-Frame-Options", "DENY"},
        {"Referrer-Policy", "no-referrer"},
        {"Cache-Control", "no-store"},
    });
    m_server.set_error_handler(httplib::Server::HandlerWithResponse([](const httplib::Request &request,
                                                                       httplib::Response &response) {
        if (!response.body.empty()) {
            return httplib::Server::HandlerResponse::Unhandled;
        }
        AnswerUnrouted(request, response);
        return httplib::Server::HandlerResponse::Handled;
    }));
    AddApiRoutes(m_server, m_feed);
    m_server.Get("/(|panel\\.css|panel\\.js|favicon\\.svg)", [](const httplib::Request &request,
                                                               httplib::Response &response) {
        const PageAsset *asset = FindPageAsset(request.path);
        response.set_content(reinterpret_cast<const char *>(asset->data), asset->size, asset->contentType);
    });
}

bool PanelServer::Bind()
{
    if (m_address.port == 0) {
        m_address.port = m_server.bind_to_any_port(m_address.host);
        if (m_address.port <= 0) {
            return false;
        }
    } else if (!m_server.bind_to_port(m_address.host, m_address.port)) {
        return false;
    }
    // The gate learns the bound port, which Host headers and the cookie name carry.
    m_gate = std::make_unique<Gate>(m_token, m_address);
    m_server.set_pre_routing_handler([this](const httplib::Request &request, httplib::Response &response) {
        return m_gate->Check(request, response);
    });
    return true;
}

bool PanelServer::Run()
{
    return m_server.listen_after_bind();
}

void PanelServer::Stop()
{
    m_server.stop();
}

}  // namespace fileindex_panel
