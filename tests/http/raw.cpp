#include "raw.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstring>
#include <stdexcept>

namespace RawHttp {

Connection::Connection(unsigned short port) : _fd(::socket(AF_INET, SOCK_STREAM, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (_fd < 0 || ::connect(_fd, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0)
        throw std::runtime_error(std::string("cannot connect: ") + std::strerror(errno));
    timeval timeout{5, 0};
    ::setsockopt(_fd, SOL_SOCKET, SO_RCVTIMEO, &timeout, sizeof timeout);
}

Connection::~Connection() { ::close(_fd); }

bool Connection::Send(std::string_view bytes) {
    while (!bytes.empty()) {
        const ssize_t n = ::send(_fd, bytes.data(), bytes.size(), MSG_NOSIGNAL);
        if (n <= 0) return false;
        bytes.remove_prefix(static_cast<std::size_t>(n));
    }
    return true;
}

Reply Connection::Receive() {
    Reply reply;
    auto fill = [this] {
        char buffer[8192];
        const ssize_t n = ::recv(_fd, buffer, sizeof buffer, 0);
        if (n <= 0) return false;
        _pending.append(buffer, static_cast<std::size_t>(n));
        return true;
    };
    std::size_t end;
    while ((end = _pending.find("\r\n\r\n")) == std::string::npos)
        if (!fill()) return reply;
    const std::string head = _pending.substr(0, end + 2);
    std::size_t length = 0;
    for (std::size_t at = 0; (at = head.find("\r\n", at)) != std::string::npos;) {
        at += 2;
        if (strncasecmp(head.c_str() + at, "Content-Length:", 15) == 0) length = std::stoul(head.substr(at + 15));
        if (strncasecmp(head.c_str() + at, "Connection: close", 17) == 0) reply.closed = true;
    }
    while (_pending.size() < end + 4 + length)
        if (!fill()) return reply;
    reply.status = std::stoi(head.substr(9, 3));
    reply.body = _pending.substr(end + 4, length);
    _pending.erase(0, end + 4 + length);
    return reply;
}

bool Connection::ClosedWithin(int millis) {
    pollfd p{_fd, POLLIN, 0};
    while (::poll(&p, 1, millis) > 0) {
        char buffer[4096];
        if (::recv(_fd, buffer, sizeof buffer, 0) <= 0) return true;
    }
    return false;
}

Hangup::Hangup() : _listener(::socket(AF_INET, SOCK_STREAM, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    const int reuse = 1;  // so that a server may take the port over at once
    ::setsockopt(_listener, SOL_SOCKET, SO_REUSEADDR, &reuse, sizeof reuse);
    if (_listener < 0 || ::bind(_listener, reinterpret_cast<sockaddr*>(&address), size) != 0 ||
        ::listen(_listener, 1) != 0 || ::getsockname(_listener, reinterpret_cast<sockaddr*>(&address), &size) != 0)
        throw std::runtime_error(std::string("cannot listen: ") + std::strerror(errno));
    _port = ntohs(address.sin_port);
    _thread = std::thread([this] {
        const int fd = ::accept(_listener, nullptr, nullptr);
        char buffer[4096];
        if (fd >= 0 && ::recv(fd, buffer, sizeof buffer, 0) > 0) ::close(fd);
    });
}

Hangup::~Hangup() {
    _thread.join();
    ::close(_listener);
}

std::string Post(std::string_view soapAction, std::string_view body, std::string_view headers) {
    return "POST /orbit HTTP/1.1\r\nHost: 127.0.0.1\r\nContent-Type: text/xml\r\nSOAPAction: " +
           std::string(soapAction) + "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n" +
           std::string(headers) + "\r\n" + std::string(body);
}

}  // namespace RawHttp
