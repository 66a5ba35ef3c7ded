#pragma once

#include <arpa/inet.h>
#include <atomic>
#include <csignal>
#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <netinet/in.h>
#include <optional>
#include <stdexcept>
#include <string>
#include <strings.h>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>
#include <utility>

namespace Testing {

/** The bytes of one accepted connection; TLS puts its own over it. */
class ByteStream
{
public:
    explicit ByteStream(int descriptor)
        : _descriptor(descriptor)
    {}
    virtual ~ByteStream() = default;
    ByteStream(const ByteStream&) = delete;
    ByteStream& operator=(const ByteStream&) = delete;

    /** @return how many bytes came; 0 or less at the end. */
    virtual long Read(char* buffer, std::size_t size) { return recv(_descriptor, buffer, size, 0); }
    virtual bool Write(const std::string& text)
    {
        std::size_t done = 0;
        while (done < text.size()) {
            const long count =
                send(_descriptor, text.data() + done, text.size() - done, MSG_NOSIGNAL);
            if (count <= 0) {
                return false;
            }
            done += static_cast<std::size_t>(count);
        }
        return true;
    }

    /** Lets TLS, if there is any, end without its own notice. */
    virtual void EndWithoutNotice() {}

    /** Has TLS, if there is any, begin anew. */
    virtual void AskForANewHandshake() {}

    /** Lets the connection end with a reset in place of an ordinary end. */
    void ResetAtClose()
    {
        const linger atOnce{1, 0};
        setsockopt(_descriptor, SOL_SOCKET, SO_LINGER, &atOnce, sizeof atOnce);
    }

protected:
    const int _descriptor;
};

struct ReceivedRequest
{
    std::string head; ///< request line and headers, without the empty line
    std::string body;
};

/** What the handler of a server works with: one connection of a client. */
class ServerConnection
{
public:
    explicit ServerConnection(std::unique_ptr<ByteStream> stream)
        : _stream(std::move(stream))
    {}

    /** The next request with a `Content-Length`; nothing when the client has closed. */
    std::optional<ReceivedRequest> ReadRequest()
    {
        std::size_t headEnd = _received.find("\r\n\r\n");
        while (headEnd == std::string::npos) {
            if (!ReadMore()) {
                return std::nullopt;
            }
            headEnd = _received.find("\r\n\r\n");
        }
        ReceivedRequest request;
        request.head = _received.substr(0, headEnd);
        const std::size_t bodyStart = headEnd + 4;
        const std::size_t length = GetContentLength(request.head);
        while (_received.size() < bodyStart + length) {
            if (!ReadMore()) {
                return std::nullopt;
            }
        }
        request.body = _received.substr(bodyStart, length);
        _received.erase(0, bodyStart + length);
        return request;
    }

    bool Write(const std::string& text) { return _stream->Write(text); }

    /** Returns when the client has closed the connection. */
    void WaitForClose()
    {
        while (ReadMore()) {
        }
    }

    ByteStream& GetStream() { return *_stream; }

private:
    static std::size_t GetContentLength(const std::string& head)
    {
        const std::string name = "\r\nContent-Length: ";
        const std::size_t position = head.find(name);
        return position == std::string::npos ? 0 : std::stoul(head.substr(position + name.size()));
    }

    bool ReadMore()
    {
        char buffer[16384];
        const long count = _stream->Read(buffer, sizeof buffer);
        if (count <= 0) {
            return false;
        }
        _received.append(buffer, static_cast<std::size_t>(count));
        return true;
    }

    std::unique_ptr<ByteStream> _stream;
    std::string _received;
};

/** A server on the loopback that runs a handler, on a thread of its own, for each connection. */
class TestServer
{
public:
    using Handler = std::function<void(ServerConnection&)>;

    /** Makes the stream of an accepted connection; null drops the connection. */
    using StreamFactory = std::function<std::unique_ptr<ByteStream>(int)>;

    explicit TestServer(
        Handler handler, StreamFactory streams = &MakePlainStream, int family = AF_INET)
        : _handler(std::move(handler))
        , _streams(std::move(streams))
        , _family(family)
        , _listener(socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0))
    {
        if (family == AF_INET6) {
            sockaddr_in6 address{};
            address.sin6_family = AF_INET6;
            address.sin6_addr = in6addr_loopback;
            Listen(reinterpret_cast<sockaddr*>(&address), sizeof address);
            _port = ntohs(address.sin6_port);
        } else {
            sockaddr_in address{};
            address.sin_family = AF_INET;
            address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
            Listen(reinterpret_cast<sockaddr*>(&address), sizeof address);
            _port = ntohs(address.sin_port);
        }
        _acceptor = std::thread([this] { Accept(); });
    }

    ~TestServer()
    {
        shutdown(_listener, SHUT_RDWR);
        _acceptor.join();
        {
            const std::lock_guard<std::mutex> lock(_mutex);
            for (const Client& client : _clients) {
                if (client.descriptor >= 0) {
                    shutdown(client.descriptor, SHUT_RDWR);
                }
            }
        }
        for (Client& client : _clients) {
            client.thread.join();
        }
        close(_listener);
    }
    TestServer(const TestServer&) = delete;
    TestServer& operator=(const TestServer&) = delete;

    int GetPort() const noexcept { return _port; }

    /** How many connections were accepted so far. */
    int GetConnectionCount() const noexcept { return _connectionCount; }

    std::string GetUrl(const std::string& path = "/") const
    {
        return std::string("http://") + (_family == AF_INET6 ? "[::1]" : "127.0.0.1") + ":"
               + std::to_string(_port) + path;
    }

    static std::unique_ptr<ByteStream> MakePlainStream(int descriptor)
    {
        return std::make_unique<ByteStream>(descriptor);
    }

private:
    struct Client
    {
        int descriptor; ///< -1 when it is closed
        std::thread thread;
    };

    void Listen(sockaddr* address, socklen_t size)
    {
        if (bind(_listener, address, size) != 0 || listen(_listener, 128) != 0
            || getsockname(_listener, address, &size) != 0) {
            throw std::runtime_error("cannot listen on the loopback");
        }
    }

    void Accept()
    {
        for (;;) {
            const int descriptor = accept4(_listener, nullptr, nullptr, SOCK_CLOEXEC);
            if (descriptor < 0) {
                return;
            }
            ++_connectionCount;
            const std::lock_guard<std::mutex> lock(_mutex);
            Client& client = _clients.emplace_back(Client{descriptor, std::thread()});
            client.thread = std::thread([this, &client, descriptor] {
                Serve(descriptor);
                const std::lock_guard<std::mutex> closeLock(_mutex);
                close(descriptor);
                client.descriptor = -1;
            });
        }
    }

    void Serve(int descriptor)
    {
        // Only here: what the tested client does about SIGPIPE is part of the test.
        sigset_t signals;
        sigemptyset(&signals);
        sigaddset(&signals, SIGPIPE);
        pthread_sigmask(SIG_BLOCK, &signals, nullptr);
        if (std::unique_ptr<ByteStream> stream = _streams(descriptor)) {
            ServerConnection connection(std::move(stream));
            _handler(connection);
        }
    }

    const Handler _handler;
    const StreamFactory _streams;
    const int _family;
    const int _listener;
    int _port = 0;
    std::atomic<int> _connectionCount{0};
    std::mutex _mutex;
    std::list<Client> _clients;
    std::thread _acceptor;
};

/** A complete reply with a length, for a connection that stays open. */
inline std::string MakeReply(
    const std::string& status, const std::string& body, const std::string& extraHeaders = "")
{
    return "HTTP/1.1 " + status + "\r\n" + extraHeaders
           + "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

/** Answers every request of a connection with the same bytes. */
inline TestServer::Handler AnswerAll(const std::string& reply)
{
    return [reply](ServerConnection& connection) {
        while (connection.ReadRequest()) {
            connection.Write(reply);
        }
    };
}

/** Answers the first request of a connection with `bytes` and closes it. */
inline TestServer::Handler AnswerAndClose(const std::string& bytes)
{
    return [bytes](ServerConnection& connection) {
        if (connection.ReadRequest()) {
            connection.Write(bytes);
        }
    };
}

} // namespace Testing
