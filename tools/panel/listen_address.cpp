// The --listen address: parsing, loopback, and the Host headers that name it.
#include "listen_address.h"

#include <arpa/inet.h>

#include <cstdlib>

namespace fileindex_panel {

namespace {

bool IsIpv4(const std::string &host)
{
    in_addr address;
    return inet_pton(AF_INET, host.c_str(), &address) == 1;
}

bool IsIpv6(const std::string &host)
{
    in6_addr address;
    return inet_pton(AF_INET6, host.c_str(), &address) == 1;
}

// Splits "host:port" or "[v6]:port" (the port optional when optionalPort); the brackets are
// dropped. False when the text has no such shape.
bool SplitHostPort(const std::string &text, std::string &host, std::string &port, bool optionalPort)
{
    size_t hostEnd;
    if (!text.empty() && text[0] == '[') {
        hostEnd = text.find(']');
        if (hostEnd == std::string::npos) {
            return false;
        }
        host = text.substr(1, hostEnd - 1);
        ++hostEnd;
    } else {
        hostEnd = text.rfind(':');
        if (hostEnd == std::string::npos) {
            hostEnd = text.size();
        }
        host = text.substr(0, hostEnd);
    }
    if (hostEnd == text.size()) {
        port.clear();
        return optionalPort;
    }
    if (text[hostEnd] != ':') {
        return false;
    }
    port = text.substr(hostEnd + 1);
    return !port.empty() && port.size() <= 5 && port.find_first_not_of("0123456789") == std::string::npos;
}

}  // namespace

std::string ListenAddress::Authority() const
{
    return (host.find(':') != std::string::npos ? "[" + host + "]" : host) + ":" + std::to_string(port);
}

bool ParseListenAddress(const std::string &text, ListenAddress &address, std::string &problem)
{
    std::string host, port;
    if (!SplitHostPort(text, host, port, false) || std::atoi(port.c_str()) > 65535 ||
        !(host == "localhost" || IsIpv4(host) || IsIpv6(host))) {
        problem = "--listen takes ADDR:PORT, ADDR an IP address ([...] for IPv6) or localhost, PORT 0-65535; got '" +
                  text + "'";
        return false;
    }
    address.host = host;
    address.port = std::atoi(port.c_str());
    address.loopback = host == "localhost" || host == "::1" || host.compare(0, 4, "127.") == 0;
    address.wildcard = host == "0.0.0.0" || host == "::";
    return true;
}

bool IsOwnHost(const std::string &hostHeader, const ListenAddress &address)
{
    std::string host, port;
    if (!SplitHostPort(hostHeader, host, port, true)) {
        return false;
    }
    const int requestPort = port.empty() ? 80 : std::atoi(port.c_str());
    if (requestPort != address.port) {
        return false;
    }
    return host == "localhost" || host == address.host || (address.wildcard && (IsIpv4(host) || IsIpv6(host)));
}

}  // namespace fileindex_panel
