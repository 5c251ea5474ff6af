#include "orbit/wire/HttpClient.h"

#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/ssl.h>
#include <poll.h>
#include <sys/socket.h>

#include <atomic>
#include <cerrno>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

#include "http_stream.h"
#include "orbit/Host.h"
#include "orbit/wire/Faults.h"

namespace Orbit::Wire {
namespace {

struct Url {
    bool tls = false;
    std::string host;  // without brackets
    std::string port;
    std::string target;
    std::string hostField;  // the Host header
};

Url ParseUrl(const std::string& text) {
    Url url;
    std::string_view rest = text;
    if (rest.starts_with("https://")) {
        url.tls = true;
        rest.remove_prefix(8);
    } else if (rest.starts_with("http://")) {
        rest.remove_prefix(7);
    } else {
        throw Kernite::InvalidArgumentException("URL " + text);
    }
    const std::size_t slash = rest.find('/');
    const std::string_view authority = rest.substr(0, slash);
    url.target = slash == std::string_view::npos ? "/" : std::string(rest.substr(slash));
    url.hostField = std::string(authority);
    std::size_t colon;
    if (authority.starts_with("[")) {
        const std::size_t close = authority.find(']');
        if (close == std::string_view::npos) throw Kernite::InvalidArgumentException("URL " + text);
        url.host = std::string(authority.substr(1, close - 1));
        colon = authority.find(':', close);
    } else {
        colon = authority.find(':');
        url.host = std::string(authority.substr(0, colon));
    }
    url.port = colon == std::string_view::npos ? (url.tls ? "443" : "80") : std::string(authority.substr(colon + 1));
    if (url.host.empty() || url.port.empty() || url.host.find('@') != std::string::npos)
        throw Kernite::InvalidArgumentException("URL " + text);
    return url;
}

std::string Base64(std::string_view text) {
    std::string out(4 * ((text.size() + 2) / 3) + 1, '\0');
    const int n = EVP_EncodeBlock(reinterpret_cast<unsigned char*>(out.data()),
                                  reinterpret_cast<const unsigned char*>(text.data()), static_cast<int>(text.size()));
    out.resize(static_cast<std::size_t>(n));
    return out;
}

// The answer as it came, before decoding.
struct Reply {
    unsigned status = 0;
    std::string contentType;
    std::string body;
};

// One call on its way: the encoded request, its deadline, and what to do with the
// outcome (called once, on an I/O thread).
struct Call {
    std::string request;
    std::string name;  // for messages: "tarn.LockStresser.AcquireLock"
    Clock::time_point deadline;
    std::function<void(std::unique_ptr<Kernite::Exception> failure, Reply reply)> done;
};

thread_local const void* tIoThreadOf = nullptr;

class Connection;

}  // namespace

struct HttpAdapter::Core : std::enable_shared_from_this<HttpAdapter::Core> {
    Core(const ClientSettings& s, const Version& v) : settings(s), url(ParseUrl(s.url)), codec(v, s.limits) {}
    ~Core();

    // A connection for `call`: an idle one that still works, else a new one while
    // fewer than the most are open (`fresh`); else the call waits for one and this
    // answers null. Counts the call in flight.
    std::shared_ptr<Connection> Acquire(std::shared_ptr<Call>& call, bool& fresh);
    // Acquires, and runs the call on the connection's strand.
    void Submit(std::shared_ptr<Call> call);
    void Release(const std::shared_ptr<Connection>& connection, bool reusable);
    void Finish(Call& call, std::unique_ptr<Kernite::Exception> failure, Reply reply);
    Kernite::Ref<Any> Decode(const Reply& reply, ManagedMethod* method) const;
    void Start(const std::shared_ptr<Connection>& connection, std::shared_ptr<Call> call);

    const ClientSettings settings;
    const Url url;
    const Codec codec;
    std::string authorization;
    std::string soapAction;
    std::optional<ssl::context> tls;

    std::mutex mutex;
    std::condition_variable callsEnded;
    std::vector<std::shared_ptr<Connection>> idle;
    std::deque<std::shared_ptr<Call>> waiting;
    std::size_t open = 0;
    std::size_t inFlight = 0;
    bool stopping = false;
    std::atomic<std::size_t> connections{0};

    net::io_context io;
    std::optional<net::executor_work_guard<net::io_context::executor_type>> work;
    std::vector<std::thread> threads;
};

namespace {

// One keep-alive connection on its own strand, carrying one call at a time.
class Connection : public std::enable_shared_from_this<Connection> {
public:
    explicit Connection(HttpAdapter::Core& core)
        : _core(core), _strand(net::make_strand(core.io)), _resolver(_strand),
          _stream(_strand, core.tls ? &*core.tls : nullptr) {
        ++_core.connections;
    }
    ~Connection() { --_core.connections; }

    const Strand& Executor() const { return _strand; }

    // Whether an idle connection can carry a call: not idle too long, and not closed
    // (or written to) by the server meanwhile. Called under the core's lock while
    // nothing runs on the connection.
    bool Usable(Clock::time_point now) {
        if (now - _idleSince > _core.settings.idleTimeout) return false;
        char byte;
        const ssize_t n = ::recv(_stream.Lowest().socket().native_handle(), &byte, 1, MSG_PEEK | MSG_DONTWAIT);
        return n < 0 && (errno == EAGAIN || errno == EWOULDBLOCK);
    }
    void MarkIdle(Clock::time_point now) { _idleSince = now; }

    // On the strand.
    void Run(std::shared_ptr<Call> call) {
        if (Clock::now() >= call->deadline) {
            // It waited for a connection all its time; this connection is not to blame.
            _core.Release(shared_from_this(), _connected);
            return _core.Finish(*call, std::make_unique<CallTimeout>("the call timed out after " +
                                                                     std::to_string(_core.settings.callTimeout.count()) +
                                                                     " ms waiting for a connection (" + call->name + ")"),
                                {});
        }
        _call = std::move(call);
        _stream.Lowest().expires_at(_call->deadline);
        if (_connected) return Send();
        _resolver.async_resolve(_core.url.host, _core.url.port,
                                [self = shared_from_this()](beast::error_code ec, tcp::resolver::results_type found) {
                                    if (ec) return self->Fail(ec, "resolving the host");
                                    self->Connect(found);
                                });
    }

    void Close() { _stream.Close(); }

    // Plain TCP that carried a call before: a synchronous call can run on its own
    // thread, sparing two thread switches a call.
    bool CanCallHere() const { return _connected && !_stream.IsTls(); }
    // The call, done on the calling thread with the socket's non-blocking operations
    // and poll() for the deadline. Whether the connection can be used again.
    bool CallHere(Call& call, Reply& reply, std::unique_ptr<Kernite::Exception>& failure);

private:
    void Connect(const tcp::resolver::results_type& found) {
        _stream.Lowest().async_connect(found, [self = shared_from_this()](beast::error_code ec, const tcp::endpoint&) {
            if (ec) return self->Fail(ec, "connecting");
            beast::error_code ignored;
            self->_stream.Lowest().socket().set_option(tcp::no_delay(true), ignored);
            if (!self->_stream.IsTls()) {
                self->_connected = true;
                return self->Send();
            }
            self->Handshake();
        });
    }

    void Handshake() {
        const std::string& host = _core.url.host;
        beast::error_code ec;
        net::ip::make_address(host, ec);
        // SNI names hosts, not addresses.
        if (ec && !SSL_set_tlsext_host_name(_stream.Tls().native_handle(), host.c_str()))
            return Fail(beast::error_code(static_cast<int>(::ERR_get_error()), net::error::get_ssl_category()),
                        "naming the TLS server");
        if (!_core.settings.insecureSkipVerification)
            _stream.Tls().set_verify_callback(ssl::host_name_verification(host));
        _stream.Tls().async_handshake(ssl::stream_base::client, [self = shared_from_this()](beast::error_code ec) {
            if (ec) return self->Fail(ec, "the TLS handshake");
            self->_connected = true;
            self->Send();
        });
    }

    void Send() {
        Prepare(*_call);
        _stream.With([this](auto& stream) {
            http::async_write(stream, *_request, [self = shared_from_this()](beast::error_code ec, std::size_t) {
                self->_request.reset();
                if (ec) return self->Fail(ec, "sending the request");
                self->Receive();
            });
        });
    }

    // The request and the parser of its answer.
    void Prepare(Call& call) {
        _request.emplace(http::verb::post, _core.url.target, 11);
        http::request<http::string_body>& r = *_request;
        r.set(http::field::host, _core.url.hostField);
        r.set(http::field::user_agent, "orbit-http-client");
        r.set(http::field::content_type, "text/xml; charset=utf-8");
        r.set("SOAPAction", _core.soapAction);
        if (!_core.authorization.empty()) r.set(http::field::authorization, _core.authorization);
        r.keep_alive(true);
        r.body() = std::move(call.request);
        r.prepare_payload();
        _parser.emplace();
        _parser->body_limit(_core.settings.limits.maxBodyBytes);
    }

    void Receive() {
        _stream.With([this](auto& stream) {
            http::async_read(stream, _buffer, *_parser, [self = shared_from_this()](beast::error_code ec, std::size_t) {
                if (ec) return self->Fail(ec, "reading the answer");
                self->Received();
            });
        });
    }

    void Received() {
        Reply reply;
        const bool reusable = Take(reply);
        std::shared_ptr<Call> call = std::move(_call);
        _core.Release(shared_from_this(), reusable);
        _core.Finish(*call, nullptr, std::move(reply));
    }

    // The answer parsed; whether the connection stays open.
    bool Take(Reply& reply) {
        http::response<http::string_body> response = _parser->release();
        _parser.reset();
        reply.status = response.result_int();
        reply.contentType = std::string(response[http::field::content_type]);
        reply.body = std::move(response.body());
        if (!response.keep_alive()) Close();
        return response.keep_alive();
    }

    std::unique_ptr<Kernite::Exception> Failure(beast::error_code ec, const std::string& doing, const Call& call) {
        Close();
        _connected = false;
        const std::string where = " (" + _core.url.hostField + ", " + call.name + ")";
        if (ec == beast::error::timeout)
            return std::make_unique<CallTimeout>("the call timed out after " +
                                                 std::to_string(_core.settings.callTimeout.count()) + " ms, " + doing +
                                                 where);
        return std::make_unique<TransportError>(doing + " failed: " + ec.message() + where);
    }

    // The call fails, and so does the connection: it is closed, the next call opens
    // another.
    void Fail(beast::error_code ec, const std::string& doing) {
        std::shared_ptr<Call> call = std::move(_call);
        std::unique_ptr<Kernite::Exception> failure = Failure(ec, doing, *call);
        _core.Release(shared_from_this(), false);
        _core.Finish(*call, std::move(failure), {});
    }

    HttpAdapter::Core& _core;
    Strand _strand;
    tcp::resolver::rebind_executor<Strand>::other _resolver;
    Stream _stream;
    bool _connected = false;
    Clock::time_point _idleSince;
    std::shared_ptr<Call> _call;
    beast::flat_buffer _buffer;
    std::optional<http::request<http::string_body>> _request;
    std::optional<http::response_parser<http::string_body>> _parser;
};

bool Connection::CallHere(Call& call, Reply& reply, std::unique_ptr<Kernite::Exception>& failure) {
    Socket& socket = _stream.Lowest().socket();
    beast::error_code ec;
    if (!socket.non_blocking()) socket.non_blocking(true, ec);
    // Waits until the socket is ready for `events`; false once the deadline passed.
    auto ready = [&](short events) {
        for (;;) {
            const auto left = std::chrono::ceil<std::chrono::milliseconds>(call.deadline - Clock::now()).count();
            if (left <= 0) return false;
            pollfd p{socket.native_handle(), events, 0};
            const int n = ::poll(&p, 1, static_cast<int>(std::min<long long>(left, 1 << 30)));
            if (n > 0) return true;
            if (n < 0 && errno != EINTR) return true;  // the next operation reports it
        }
    };
    auto blocked = [](const beast::error_code& e) {
        return e == net::error::would_block || e == net::error::try_again;
    };
    Prepare(call);
    http::serializer<true, http::string_body> serializer(*_request);
    while (!ec && !serializer.is_done()) {
        http::write_some(socket, serializer, ec);
        if (blocked(ec)) ec = ready(POLLOUT) ? beast::error_code() : beast::error::timeout;
    }
    _request.reset();
    if (ec) {
        failure = Failure(ec, "sending the request", call);
        return false;
    }
    while (!ec && !_parser->is_done()) {
        http::read_some(socket, _buffer, *_parser, ec);
        if (blocked(ec)) ec = ready(POLLIN) ? beast::error_code() : beast::error::timeout;
    }
    if (ec) {
        failure = Failure(ec, "reading the answer", call);
        return false;
    }
    return Take(reply);
}

}  // namespace

HttpAdapter::Core::~Core() {
    // Normally joined by Shutdown(); when the last holder was an I/O thread, that
    // one cannot join itself.
    for (std::thread& thread : threads) {
        if (!thread.joinable()) continue;
        if (thread.get_id() == std::this_thread::get_id()) thread.detach();
        else thread.join();
    }
}

void HttpAdapter::Core::Start(const std::shared_ptr<Connection>& connection, std::shared_ptr<Call> call) {
    net::post(connection->Executor(), [connection, call = std::move(call)]() mutable { connection->Run(std::move(call)); });
}

std::shared_ptr<Connection> HttpAdapter::Core::Acquire(std::shared_ptr<Call>& call, bool& fresh) {
    std::vector<std::shared_ptr<Connection>> stale;
    std::shared_ptr<Connection> connection;
    fresh = false;
    {
        std::lock_guard<std::mutex> lock(mutex);
        if (stopping) throw Kernite::Exception("the HTTP adapter is shut down");
        ++inFlight;
        const Clock::time_point now = Clock::now();
        while (!idle.empty() && !connection) {
            std::shared_ptr<Connection> candidate = std::move(idle.back());
            idle.pop_back();
            if (candidate->Usable(now)) {
                connection = std::move(candidate);
            } else {
                --open;
                stale.push_back(std::move(candidate));
            }
        }
        if (!connection && open < settings.maxConnections) {
            ++open;
            connection = std::make_shared<Connection>(*this);
            fresh = true;
        }
        if (!connection) waiting.push_back(std::move(call));
    }
    for (std::shared_ptr<Connection>& old : stale) net::post(old->Executor(), [old] { old->Close(); });
    return connection;
}

void HttpAdapter::Core::Submit(std::shared_ptr<Call> call) {
    bool fresh;
    if (std::shared_ptr<Connection> connection = Acquire(call, fresh)) Start(connection, std::move(call));
}

void HttpAdapter::Core::Release(const std::shared_ptr<Connection>& connection, bool reusable) {
    std::shared_ptr<Call> next;
    std::shared_ptr<Connection> carrier = connection;
    {
        std::lock_guard<std::mutex> lock(mutex);
        if (!waiting.empty()) {
            next = std::move(waiting.front());
            waiting.pop_front();
            if (!reusable) carrier = std::make_shared<Connection>(*this);
        } else if (reusable) {
            connection->MarkIdle(Clock::now());
            idle.push_back(connection);
        } else {
            --open;
        }
    }
    if (next) Start(carrier, std::move(next));
}

void HttpAdapter::Core::Finish(Call& call, std::unique_ptr<Kernite::Exception> failure, Reply reply) {
    call.done(std::move(failure), std::move(reply));
    std::lock_guard<std::mutex> lock(mutex);
    if (--inFlight == 0) callsEnded.notify_all();
}

Kernite::Ref<Any> HttpAdapter::Core::Decode(const Reply& reply, ManagedMethod* method) const {
    const bool xml = reply.contentType.find("xml") != std::string::npos;
    if (reply.status == 200 && xml) return codec.DecodeResponse(reply.body, *method);
    const std::string status = "HTTP " + std::to_string(reply.status) + " from " + url.hostField;
    if (!xml) throw TransportError(status + ": " + reply.body.substr(0, 200));
    Kernite::Ref<MethodFault> fault;
    try {
        fault = codec.DecodeFault(reply.body);
    } catch (const InvalidRequest::Exception& e) {
        throw TransportError(status + " without a readable fault: " + e.what());
    }
    fault->Throw();
    __builtin_unreachable();
}

HttpAdapter::HttpAdapter(const ClientSettings& settings) {
    Version* version = GetVersionMap()->GetVersion(settings.apiVersion);
    if (version == nullptr || version->GetServiceNamespace().empty())
        throw Kernite::InvalidArgumentException("API version " + settings.apiVersion);
    _core = std::make_shared<Core>(settings, *version);
    Core& core = *_core;
    if (settings.maxConnections == 0 || settings.ioThreads < 1)
        throw Kernite::InvalidArgumentException(std::string("no connection or no I/O thread"));
    const bool basic = !settings.basicUser.empty() || !settings.basicPassword.empty();
    if (basic && !settings.bearerToken.empty())
        throw Kernite::InvalidArgumentException(std::string("both Basic credentials and a bearer token"));
    if (basic && !core.url.tls && !settings.allowBasicOverPlainHttp)
        throw Kernite::InvalidArgumentException(std::string("Basic credentials over plain HTTP"));
    if (basic) core.authorization = "Basic " + Base64(settings.basicUser + ":" + settings.basicPassword);
    else if (!settings.bearerToken.empty()) core.authorization = "Bearer " + settings.bearerToken;
    core.soapAction = "\"" + SoapAction(*version) + "\"";
    if (core.url.tls) {
        core.tls.emplace(ssl::context::tls_client);
        core.tls->set_options(ssl::context::default_workarounds | ssl::context::no_sslv2 | ssl::context::no_sslv3 |
                              ssl::context::no_tlsv1 | ssl::context::no_tlsv1_1);
        if (settings.insecureSkipVerification) {
            core.tls->set_verify_mode(ssl::verify_none);
        } else {
            core.tls->set_verify_mode(ssl::verify_peer);
            beast::error_code ec;
            if (settings.caFile.empty()) core.tls->set_default_verify_paths(ec);
            else core.tls->load_verify_file(settings.caFile, ec);
            if (ec) throw Kernite::InvalidArgumentException("CA file '" + settings.caFile + "': " + ec.message());
        }
    }
    core.work.emplace(core.io.get_executor());
    for (int i = 0; i < settings.ioThreads; ++i) {
        core.threads.emplace_back([core = _core] {
            tIoThreadOf = core.get();
            core->io.run();
        });
    }
}

HttpAdapter::~HttpAdapter() { Shutdown(); }

const Version& HttpAdapter::GetVersion() const noexcept { return _core->codec.GetVersion(); }

std::size_t HttpAdapter::OpenConnections() const { return _core->connections.load(); }

void HttpAdapter::Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                         Kernite::Ref<Any>& result, RequestContext*) {
    result = nullptr;
    if (tIoThreadOf == _core.get())
        throw Kernite::Exception("a synchronous call on the HTTP adapter's own I/O thread would wait for itself");
    if (method == nullptr) throw Kernite::InvalidArgumentException(std::string("no method"));
    const Type* type = method->GetDeclaringType();
    // What the server hands back, shared with the I/O thread that receives it.
    struct Outcome {
        std::mutex mutex;
        std::condition_variable ready;
        bool done = false;
        std::unique_ptr<Kernite::Exception> failure;
        Reply reply;
    };
    auto outcome = std::make_shared<Outcome>();
    auto call = std::make_shared<Call>();
    call->request = _core->codec.EncodeRequest(MoRef(type ? type->GetName() : std::string(), id), *method, args);
    call->name = Describe(method);
    call->deadline = Clock::now() + _core->settings.callTimeout;
    call->done = [outcome](std::unique_ptr<Kernite::Exception> failure, Reply reply) {
        std::lock_guard<std::mutex> lock(outcome->mutex);
        outcome->failure = std::move(failure);
        outcome->reply = std::move(reply);
        outcome->done = true;
        outcome->ready.notify_one();
    };
    bool fresh;
    std::shared_ptr<Connection> connection = _core->Acquire(call, fresh);
    if (connection && connection->CanCallHere()) {
        Reply reply;
        std::unique_ptr<Kernite::Exception> failure;
        const bool reusable = connection->CallHere(*call, reply, failure);
        _core->Release(connection, reusable);
        _core->Finish(*call, std::move(failure), std::move(reply));
    } else if (connection) {
        _core->Start(connection, call);
    }
    std::unique_lock<std::mutex> lock(outcome->mutex);
    outcome->ready.wait(lock, [&] { return outcome->done; });
    if (outcome->failure) outcome->failure->Throw();
    result = _core->Decode(outcome->reply, method);
}

void HttpAdapter::StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                              const CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item,
                              RequestContext*) {
    Kernite::Ref<Kernite::System::ScheduledItem> started(new Kernite::System::ScheduledItem());
    auto call = std::make_shared<Call>();
    std::weak_ptr<Core> weakCore = _core;
    call->done = [weakCore, method, callback, started](std::unique_ptr<Kernite::Exception> failure, Reply reply) {
        CompleteCall(started.Get(), callback, [&] {
            if (failure) failure->Throw();
            // The core outlives every call it carries.
            return weakCore.lock()->Decode(reply, method);
        });
    };
    call->deadline = Clock::now() + _core->settings.callTimeout;
    std::unique_ptr<Kernite::Exception> refused;
    try {
        if (method == nullptr) throw Kernite::InvalidArgumentException(std::string("no method"));
        const Type* type = method->GetDeclaringType();
        call->name = Describe(method);
        call->request = _core->codec.EncodeRequest(MoRef(type ? type->GetName() : std::string(), id), *method, args);
    } catch (...) {
        refused = CaptureFailure();
    }
    if (!refused) {
        _core->Submit(call);
    } else {
        // As for any failed call: the callback hears of it on an I/O thread.
        {
            std::lock_guard<std::mutex> lock(_core->mutex);
            if (_core->stopping) throw Kernite::Exception("the HTTP adapter is shut down");
            ++_core->inFlight;
        }
        net::post(_core->io, [core = _core, call, failure = std::shared_ptr<Kernite::Exception>(std::move(refused))] {
            core->Finish(*call, std::unique_ptr<Kernite::Exception>(failure->Clone()), {});
        });
    }
    item = std::move(started);
}

Kernite::Ref<ManagedObject> HttpAdapter::CreateStub(const MoRef* reference, RequestContext* context) {
    if (reference == nullptr) return nullptr;
    auto* type = dynamic_cast<ManagedObjectType*>(GetTypeMap()->GetType(reference->GetType()));
    if (type == nullptr) throw Kernite::InvalidArgumentException("managed type " + reference->GetType());
    return type->CreateStub(reference->GetId(), this, context);
}

void HttpAdapter::Shutdown() {
    Core& core = *_core;
    {
        std::unique_lock<std::mutex> lock(core.mutex);
        if (core.stopping) return;
        core.stopping = true;
        // Calls end by their timeouts at the latest.
        if (tIoThreadOf != &core) core.callsEnded.wait(lock, [&core] { return core.inFlight == 0; });
    }
    std::vector<std::shared_ptr<Connection>> idle;
    {
        std::lock_guard<std::mutex> lock(core.mutex);
        idle.swap(core.idle);
    }
    for (std::shared_ptr<Connection>& connection : idle)
        net::post(connection->Executor(), [connection] { connection->Close(); });
    core.work.reset();
    if (tIoThreadOf == &core) return;  // the threads end on their own, holding the core
    for (std::thread& thread : core.threads) thread.join();
    core.threads.clear();
}

}  // namespace Orbit::Wire
