// What the server's and the client's connections share: Boost's names, and a stream
// that is plain TCP or TLS over TCP, chosen when the connection is made.
#pragma once

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl.hpp>
#include <boost/asio/strand.hpp>
#include <boost/beast/core.hpp>
#include <boost/beast/http.hpp>
#include <boost/beast/ssl.hpp>
#include <chrono>
#include <optional>

namespace Orbit::Wire {

namespace beast = boost::beast;
namespace http = beast::http;
namespace net = boost::asio;
namespace ssl = net::ssl;
using tcp = net::ip::tcp;
using Clock = std::chrono::steady_clock;
// Concrete executor types rather than type-erased ones: a call crosses them often.
using Strand = net::strand<net::io_context::executor_type>;
using TcpStream = beast::basic_stream<tcp, Strand>;
using Socket = TcpStream::socket_type;

class Stream {
public:
    // A connection accepted by a server, TLS when `tls` is given.
    Stream(Socket&& socket, ssl::context* tls) {
        if (tls) _tls.emplace(std::move(socket), *tls);
        else _plain.emplace(std::move(socket));
    }
    // A client's connection, not connected yet.
    Stream(const Strand& executor, ssl::context* tls) {
        if (tls) _tls.emplace(executor, *tls);
        else _plain.emplace(executor);
    }

    bool IsTls() const noexcept { return _tls.has_value(); }
    beast::ssl_stream<TcpStream>& Tls() { return *_tls; }
    // The TCP stream under it all, which holds the timeouts.
    TcpStream& Lowest() { return _tls ? beast::get_lowest_layer(*_tls) : *_plain; }

    // Calls `operation` with the stream the HTTP messages travel on.
    template <class Operation>
    void With(Operation&& operation) {
        if (_tls) operation(*_tls);
        else operation(*_plain);
    }

    void Close() {
        beast::error_code ignored;
        Lowest().socket().close(ignored);
    }

private:
    std::optional<TcpStream> _plain;
    std::optional<beast::ssl_stream<TcpStream>> _tls;
};

}  // namespace Orbit::Wire
