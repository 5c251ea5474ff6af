#include "orbit/wire/HttpServer.h"

#include <atomic>
#include <condition_variable>
#include <future>
#include <mutex>
#include <sstream>
#include <thread>
#include <unordered_map>
#include <vector>

#include "http_stream.h"
#include "orbit/wire/Wsdl.h"
#include "soap_call.h"

namespace Orbit::Wire {
namespace {

// What is read and thrown away after an error answer, so that closing does not
// reset the connection before the client has read the answer.
constexpr std::size_t kDrainBytes = 1 << 20;
constexpr std::chrono::seconds kDrainTime{2};

using Response = http::response<http::string_body>;

Response ToResponse(Answer answer) {
    Response response{static_cast<http::status>(answer.status), 11};
    response.set(http::field::server, "orbit-http");
    response.set(http::field::content_type, answer.contentType);
    response.body() = std::move(answer.body);
    return response;
}

bool IsHttpError(const beast::error_code& ec) {
    return ec.category() == http::make_error_code(http::error::bad_target).category();
}

std::string PeerOf(const Socket& socket) {
    beast::error_code ec;
    const tcp::endpoint peer = socket.remote_endpoint(ec);
    return ec ? std::string("?") : peer.address().to_string() + ":" + std::to_string(peer.port());
}

class Session;

}  // namespace

struct HttpServer::Impl {
    Impl(const ObjectHost& host, ServerSettings s) : settings(std::move(s)), calls(host, settings) {}

    void Accept();
    void OnAccept(beast::error_code ec, Socket socket);
    void Forget(Session* session);
    Response Serve(const http::request<http::string_body>& request, const std::string& peer);
    Answer Wsdl(std::string_view query);

    const ServerSettings settings;
    SoapCalls calls;
    std::optional<ssl::context> tls;
    std::string url;
    unsigned short port = 0;
    std::atomic<bool> stopping{false};
    bool stopped = false;  // under sessionsMutex

    mutable std::mutex sessionsMutex;
    std::condition_variable sessionsEnded;
    std::unordered_map<Session*, std::weak_ptr<Session>> sessions;

    // Destroyed first: the handlers still queued hold sessions, which Forget() themselves.
    net::io_context io;
    std::optional<net::executor_work_guard<net::io_context::executor_type>> work;
    tcp::acceptor acceptor{net::make_strand(io)};
    std::vector<std::thread> workers;
};

namespace {

// One connection, on its own strand: read a header (idle timeout), the body (read
// timeout), answer (write timeout), again while the connection is kept alive.
class Session : public std::enable_shared_from_this<Session> {
public:
    Session(HttpServer::Impl& server, Socket&& socket)
        : _server(server), _peer(PeerOf(socket)), _stream(std::move(socket), server.tls ? &*server.tls : nullptr) {}
    ~Session() { _server.Forget(this); }

    Strand Executor() { return _stream.Lowest().get_executor(); }

    void Start() {
        if (!_stream.IsTls()) return ReadHeader();
        _stream.Lowest().expires_after(_server.settings.readTimeout);
        _stream.Tls().async_handshake(ssl::stream_base::server,
                              [self = shared_from_this()](beast::error_code ec) {
                                  if (ec) return self->Close();
                                  self->ReadHeader();
                              });
    }

    // On the strand: a connection that waits for a request is closed, one that is
    // busy with a request closes once it has answered.
    void Stop(bool force) {
        if (force || _waitingForHeader) Close();
    }

private:
    void ReadHeader() {
        if (_server.stopping) return Close();
        _parser.emplace();
        _parser->header_limit(static_cast<std::uint32_t>(_server.settings.maxHeaderBytes));
        _parser->body_limit(_server.settings.limits.maxBodyBytes);
        _waitingForHeader = true;
        _stream.Lowest().expires_after(_server.settings.idleTimeout);
        _stream.With([this](auto& stream) {
            http::async_read_header(stream, _buffer, *_parser,
                                    [self = shared_from_this()](beast::error_code ec, std::size_t) {
                                        self->OnHeader(ec);
                                    });
        });
    }

    void OnHeader(beast::error_code ec) {
        _waitingForHeader = false;
        if (ec) return Refuse(ec);
        _stream.Lowest().expires_after(_server.settings.readTimeout);
        if (beast::iequals(_parser->get()[http::field::expect], "100-continue")) {
            _continue.emplace(http::status::continue_, 11);
            return _stream.With([this](auto& stream) {
                http::async_write(stream, *_continue, [self = shared_from_this()](beast::error_code ec, std::size_t) {
                    if (ec) return self->Close();
                    self->ReadBody();
                });
            });
        }
        ReadBody();
    }

    void ReadBody() {
        _stream.With([this](auto& stream) {
            http::async_read(stream, _buffer, *_parser, [self = shared_from_this()](beast::error_code ec, std::size_t) {
                self->OnBody(ec);
            });
        });
    }

    void OnBody(beast::error_code ec) {
        if (ec) return Refuse(ec);
        const http::request<http::string_body>& request = _parser->get();
        Response response = _server.Serve(request, _peer);
        response.keep_alive(request.keep_alive() && !_server.stopping);
        Write(std::move(response));
    }

    // A request that could not be read: answered when it is the client's fault,
    // else the connection just ends.
    void Refuse(beast::error_code ec) {
        const SoapCalls& calls = _server.calls;
        if (ec == http::error::body_limit) {
            const std::string what =
                "a body over the limit of " + std::to_string(_server.settings.limits.maxBodyBytes) + " bytes";
            return Write(ToResponse(calls.Refusal(413, true, _parser->get()[kSoapActionField], what)), true);
        }
        if (ec == http::error::header_limit) {
            const std::string what =
                "a header over the limit of " + std::to_string(_server.settings.maxHeaderBytes) + " bytes";
            return Write(ToResponse(calls.Refusal(431, true, {}, what)), true);
        }
        if (IsHttpError(ec) && ec != http::error::end_of_stream && ec != http::error::partial_message)
            return Write(ToResponse(calls.Refusal(400, false, {}, "malformed HTTP: " + ec.message())), true);
        Close();
    }

    void Write(Response&& response, bool thenDrain = false) {
        _response.emplace(std::move(response));
        if (thenDrain) _response->keep_alive(false);
        _response->prepare_payload();
        _stream.Lowest().expires_after(_server.settings.writeTimeout);
        _stream.With([this, thenDrain](auto& stream) {
            http::async_write(stream, *_response,
                              [self = shared_from_this(), thenDrain](beast::error_code ec, std::size_t) {
                                  self->OnWrite(ec, thenDrain);
                              });
        });
    }

    void OnWrite(beast::error_code ec, bool thenDrain) {
        const bool keepAlive = _response->keep_alive();
        _response.reset();
        if (ec) return Close();
        if (thenDrain) return Drain();
        if (!keepAlive) return Shut();
        ReadHeader();
    }

    // Ends the stream properly (TLS close_notify, then a half close).
    void Shut() {
        if (!_stream.IsTls()) {
            beast::error_code ignored;
            _stream.Lowest().socket().shutdown(tcp::socket::shutdown_send, ignored);
            return Close();
        }
        _stream.Lowest().expires_after(_server.settings.writeTimeout);
        _stream.Tls().async_shutdown([self = shared_from_this()](beast::error_code) { self->Close(); });
    }

    // After an error answer: half close, then read and discard what the client still
    // sends for a while, so that closing does not reset the answer away.
    void Drain() {
        if (!_stream.IsTls()) {
            beast::error_code ignored;
            _stream.Lowest().socket().shutdown(tcp::socket::shutdown_send, ignored);
        }
        _drained = 0;
        _drainUntil = Clock::now() + kDrainTime;
        DrainSome();
    }

    void DrainSome() {
        if (_drained >= kDrainBytes || Clock::now() >= _drainUntil) return Close();
        _stream.Lowest().expires_at(_drainUntil);
        _stream.With([this](auto& stream) {
            stream.async_read_some(net::buffer(_scratch), [self = shared_from_this()](beast::error_code ec, std::size_t n) {
                if (ec) return self->Close();
                self->_drained += n;
                self->DrainSome();
            });
        });
    }

    void Close() {
        _waitingForHeader = false;
        _stream.Close();
    }

    HttpServer::Impl& _server;
    const std::string _peer;
    Stream _stream;
    beast::flat_buffer _buffer;
    std::optional<http::request_parser<http::string_body>> _parser;
    std::optional<http::response<http::empty_body>> _continue;
    std::optional<Response> _response;
    bool _waitingForHeader = false;
    std::size_t _drained = 0;
    Clock::time_point _drainUntil;
    std::array<char, 4096> _scratch;
};

}  // namespace

void HttpServer::Impl::Accept() {
    acceptor.async_accept(net::make_strand(io), [this](beast::error_code ec, Socket socket) {
        OnAccept(ec, std::move(socket));
    });
}

void HttpServer::Impl::OnAccept(beast::error_code ec, Socket socket) {
    if (!acceptor.is_open() || ec == net::error::operation_aborted) return;
    if (!ec) {
        std::shared_ptr<Session> session;
        {
            std::lock_guard<std::mutex> lock(sessionsMutex);
            if (!stopping && sessions.size() < settings.maxConnections) {
                session = std::make_shared<Session>(*this, std::move(socket));
                sessions.emplace(session.get(), session);
            }
        }
        if (session) net::dispatch(session->Executor(), [session] { session->Start(); });
        else socket.close(ec);
    }
    Accept();
}

void HttpServer::Impl::Forget(Session* session) {
    std::lock_guard<std::mutex> lock(sessionsMutex);
    sessions.erase(session);
    if (sessions.empty()) sessionsEnded.notify_all();
}

Response HttpServer::Impl::Serve(const http::request<http::string_body>& request, const std::string& peer) {
    const std::string_view target = request.target();
    const std::size_t question = target.find('?');
    const std::string_view path = target.substr(0, question);
    const std::string_view query = question == std::string_view::npos ? std::string_view() : target.substr(question + 1);
    Response response;
    if (path != kServicePath) {
        response = ToResponse(
            TextAnswer(404, "no service at " + std::string(path) + "; the service path is " + kServicePath));
    } else if (request.method() == http::verb::post) {
        response = ToResponse(calls.Call(request[kSoapActionField], request[http::field::authorization],
                                         request.body(), peer, tls.has_value()));
    } else if (request.method() == http::verb::get) {
        response = ToResponse(Wsdl(query));
    } else {
        response = ToResponse(TextAnswer(405, "the service takes POST (calls) and GET ?wsdl&version=<version name>"));
        response.set(http::field::allow, "GET, POST");
    }
    response.version(request.version());
    return response;
}

Answer HttpServer::Impl::Wsdl(std::string_view query) {
    bool wsdl = false;
    std::string versionName;
    while (!query.empty()) {
        const std::size_t amp = query.find('&');
        const std::string_view pair = query.substr(0, amp);
        if (pair == "wsdl" || pair == "wsdl=") wsdl = true;
        else if (pair.starts_with("version=")) versionName = std::string(pair.substr(8));
        query = amp == std::string_view::npos ? std::string_view() : query.substr(amp + 1);
    }
    if (!wsdl) return TextAnswer(400, "GET serves only ?wsdl&version=<version name>");
    Version* version = GetVersionMap()->GetVersion(versionName);
    if (version == nullptr || version->GetServiceNamespace().empty())
        return TextAnswer(404, "no API version named '" + versionName + "'");
    std::ostringstream out;
    WriteWsdl(*version, out, url);
    return Answer{200, kXmlContentType, std::move(out).str()};
}

HttpServer::HttpServer(ServerSettings settings) : _impl(std::make_unique<Impl>(*this, std::move(settings))) {
    Impl& impl = *_impl;
    const ServerSettings& s = impl.settings;
    if (s.workerThreads < 1) throw Kernite::InvalidArgumentException("workerThreads " + std::to_string(s.workerThreads));
    if (s.certificateFile.empty() != s.privateKeyFile.empty())
        throw Kernite::InvalidArgumentException(std::string("a certificate without its key, or a key without its certificate"));
    try {
        if (!s.certificateFile.empty()) {
            impl.tls.emplace(ssl::context::tls_server);
            impl.tls->set_options(ssl::context::default_workarounds | ssl::context::no_sslv2 |
                                  ssl::context::no_sslv3 | ssl::context::no_tlsv1 | ssl::context::no_tlsv1_1);
            impl.tls->use_certificate_chain_file(s.certificateFile);
            impl.tls->use_private_key_file(s.privateKeyFile, ssl::context::pem);
        }
        const tcp::endpoint endpoint(net::ip::make_address(s.address), s.port);
        impl.acceptor.open(endpoint.protocol());
        impl.acceptor.set_option(net::socket_base::reuse_address(true));
        impl.acceptor.bind(endpoint);
        impl.acceptor.listen(net::socket_base::max_listen_connections);
        impl.port = impl.acceptor.local_endpoint().port();
    } catch (const boost::system::system_error& e) {
        throw TransportError("cannot serve at " + s.address + ":" + std::to_string(s.port) + ": " + e.what());
    }
    const std::string host = s.address.find(':') != std::string::npos ? "[" + s.address + "]" : s.address;
    impl.url = std::string(impl.tls ? "https" : "http") + "://" + host + ":" + std::to_string(impl.port) + kServicePath;
    impl.work.emplace(impl.io.get_executor());
    impl.Accept();
    for (int i = 0; i < s.workerThreads; ++i) impl.workers.emplace_back([&impl] { impl.io.run(); });
}

HttpServer::~HttpServer() {
    try {
        Stop();
    } catch (...) {
        // On a worker: the server is being destroyed by a call it serves, and the
        // process is in trouble anyway; the workers are left to end on their own.
        for (std::thread& worker : _impl->workers) worker.detach();
    }
}

unsigned short HttpServer::Port() const noexcept { return _impl->port; }
std::string HttpServer::Url() const { return _impl->url; }

std::size_t HttpServer::OpenConnections() const {
    std::lock_guard<std::mutex> lock(_impl->sessionsMutex);
    return _impl->sessions.size();
}

void HttpServer::Stop() {
    Impl& impl = *_impl;
    for (const std::thread& worker : impl.workers)
        if (worker.get_id() == std::this_thread::get_id())
            throw Kernite::Exception("an HTTP server cannot be stopped from one of its own workers");
    std::vector<std::weak_ptr<Session>> sessions;
    {
        std::lock_guard<std::mutex> lock(impl.sessionsMutex);
        if (impl.stopped) return;
        impl.stopped = true;
        impl.stopping = true;
    }
    std::promise<void> closed;
    net::post(impl.acceptor.get_executor(), [&impl, &closed] {
        beast::error_code ignored;
        impl.acceptor.close(ignored);
        closed.set_value();
    });
    closed.get_future().wait();

    auto tell = [&impl](bool force) {
        std::vector<std::shared_ptr<Session>> live;
        {
            std::lock_guard<std::mutex> lock(impl.sessionsMutex);
            for (auto& entry : impl.sessions)
                if (std::shared_ptr<Session> session = entry.second.lock()) live.push_back(std::move(session));
        }
        for (std::shared_ptr<Session>& session : live) {
            Strand executor = session->Executor();
            net::post(executor, [session = std::move(session), force] { session->Stop(force); });
        }
    };
    auto wait = [&impl](std::chrono::milliseconds limit) {
        std::unique_lock<std::mutex> lock(impl.sessionsMutex);
        return impl.sessionsEnded.wait_for(lock, limit, [&impl] { return impl.sessions.empty(); });
    };
    tell(false);
    if (!wait(impl.settings.stopGrace)) {
        tell(true);
        wait(std::chrono::seconds(5));
    }
    impl.work.reset();
    impl.io.stop();
    for (std::thread& worker : impl.workers) worker.join();
    impl.workers.clear();
}

}  // namespace Orbit::Wire
