// A client that writes whatever bytes it likes, for the requests no well-behaved
// client sends, and reads answers one at a time.
#pragma once

#include <string>
#include <string_view>
#include <thread>

namespace RawHttp {

struct Reply {
    int status = 0;  // 0: the connection ended before a whole answer
    std::string body;
    bool closed = false;  // the server said it closes the connection
};

class Connection {
public:
    explicit Connection(unsigned short port);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    // False when the server has closed (or reset) the connection.
    bool Send(std::string_view bytes);
    Reply Receive();
    // Whether the server ends the connection within `millis`.
    bool ClosedWithin(int millis);

private:
    int _fd;
    std::string _pending;
};

// A server that hangs up: listens on a free port of 127.0.0.1, takes one
// connection, waits for a request and closes without answering.
class Hangup {
public:
    Hangup();
    ~Hangup();
    unsigned short Port() const noexcept { return _port; }

private:
    int _listener;
    unsigned short _port = 0;
    std::thread _thread;
};

// "POST /orbit" with the envelope and the headers given (each ending in \r\n).
std::string Post(std::string_view soapAction, std::string_view body, std::string_view headers = {});

}  // namespace RawHttp
