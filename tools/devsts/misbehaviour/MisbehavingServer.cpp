#include "devsts/misbehaviour/MisbehavingServer.h"

#include "devsts/misbehaviour/Script.h"
#include "devsts/misbehaviour/TlsSide.h"
#include "devsts/service/TokenService.h"
#include "devsts/state/State.h"

#include <atomic>
#include <condition_variable>
#include <list>
#include <mutex>
#include <netdb.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <optional>
#include <stdexcept>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

namespace DevSts {

namespace {

constexpr const char* Path = "/sts";

/** A socket that listens; closed with it. */
class Listener
{
public:
    Listener(const std::string& host, int port)
    {
        addrinfo* found = nullptr;
        addrinfo wanted{};
        wanted.ai_socktype = SOCK_STREAM;
        wanted.ai_flags = AI_PASSIVE;
        if (getaddrinfo(host.c_str(), std::to_string(port).c_str(), &wanted, &found) == 0) {
            Listen(*found);
            freeaddrinfo(found);
        }
        if (_port == 0) {
            throw std::runtime_error("Cannot listen on " + host + ":" + std::to_string(port));
        }
    }

    ~Listener()
    {
        if (_socket >= 0) {
            close(_socket);
        }
    }

    Listener(const Listener&) = delete;
    Listener& operator=(const Listener&) = delete;

    int Port() const { return _port; }

    /** @return a socket; negative after `Stop`. */
    int Accept() const
    {
        const int yes = 1;
        const int accepted = accept4(_socket, nullptr, nullptr, SOCK_CLOEXEC);
        setsockopt(accepted, IPPROTO_TCP, TCP_NODELAY, &yes, sizeof yes);
        return accepted;
    }

    void Stop() const { shutdown(_socket, SHUT_RDWR); }

private:
    void Listen(const addrinfo& address)
    {
        const int yes = 1;
        _socket = socket(address.ai_family, address.ai_socktype | SOCK_CLOEXEC, 0);
        setsockopt(_socket, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
        sockaddr_in6 bound{};
        socklen_t size = sizeof bound;
        auto* const generic = reinterpret_cast<sockaddr*>(&bound);
        if (bind(_socket, address.ai_addr, address.ai_addrlen) == 0
            && listen(_socket, SOMAXCONN) == 0 && getsockname(_socket, generic, &size) == 0) {
            _port = ntohs(bound.sin6_port); // at the same place in an address of IPv4
        }
    }

    int _socket = -1;
    int _port = 0;
};

/** One client, served by a thread of its own. */
struct Connection
{
    int socket = -1;
    std::atomic<bool> isOver{false};
    std::thread thread;
};

} // namespace

class MisbehavingServer::Impl
{
public:
    Impl(const Options& options, const Misbehaviour& misbehaviour)
        : _options(options)
        , _misbehaviour(misbehaviour)
        , _state(options.stateDir)
        , _service(_state, options.clock, NegotiatorOptions())
    {
        if (!options.plainHttp) {
            _tls.emplace(misbehaviour, _state, options.host);
        }
    }

    ~Impl() { Stop(); }

    int Start()
    {
        _listener.emplace(_options.host, _options.port);
        _acceptor = std::thread([this] { Accept(); });
        return _listener->Port();
    }

    void Stop()
    {
        if (!_acceptor.joinable()) {
            return;
        }
        _listener->Stop();
        _acceptor.join();
        for (const Connection& connection : _connections) {
            shutdown(connection.socket, SHUT_RDWR);
        }
        Drop([](const Connection&) { return true; });
    }

    std::string Url() const
    {
        const bool isIpv6 = _options.host.find(':') != std::string::npos;
        return std::string(_options.plainHttp ? "http" : "https") + "://"
               + (isIpv6 ? "[" + _options.host + "]" : _options.host) + ":"
               + std::to_string(_listener->Port()) + Path;
    }

    void AwaitQuiet()
    {
        std::unique_lock<std::mutex> lock(_mutex);
        _becameQuiet.wait(lock, [this] { return _isQuiet; });
    }

private:
    void Accept()
    {
        for (;;) {
            const int socket = _listener->Accept();
            if (socket < 0) {
                return;
            }
            Drop([](const Connection& connection) { return connection.isOver.load(); });
            Connection& connection = _connections.emplace_back();
            connection.socket = socket;
            connection.thread = std::thread([this, &connection] {
                Serve(connection.socket);
                connection.isOver = true;
            });
        }
    }

    void Serve(int socket)
    {
        const std::unique_ptr<SecureChannel> secure = _tls ? _tls->Accept(socket) : nullptr;
        if (_tls && secure == nullptr) {
            shutdown(socket, SHUT_RDWR);
            return;
        }
        Channel bare(socket);
        Channel& channel = secure != nullptr ? *secure : bare;
        const ScriptHost host{
            [this](const ReceivedRequest& request) { return _service.Answer(request); },
            [this] { NoteQuiet(); }};
        Script(channel, secure.get(), host, _misbehaviour.parameter).Run(_misbehaviour.acts);
    }

    void NoteQuiet()
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _isQuiet = true;
        _becameQuiet.notify_all();
    }

    /** Forgets the connections that `isDue`, once they are over. */
    template <class Test>
    void Drop(const Test& isDue)
    {
        for (auto position = _connections.begin(); position != _connections.end();) {
            if (!isDue(*position)) {
                ++position;
                continue;
            }
            position->thread.join();
            close(position->socket);
            position = _connections.erase(position);
        }
    }

    const Options _options;
    const Misbehaviour _misbehaviour;
    const State _state;
    TokenService _service;
    std::optional<TlsSide> _tls;
    std::optional<Listener> _listener;
    std::thread _acceptor;
    std::mutex _mutex; ///< guards the next
    bool _isQuiet = false;
    std::condition_variable _becameQuiet;
    std::list<Connection> _connections; ///< the acceptor's, until it has ended
};

MisbehavingServer::MisbehavingServer(const Options& options, const Misbehaviour& misbehaviour)
    : _impl(std::make_unique<Impl>(options, misbehaviour))
{}

MisbehavingServer::~MisbehavingServer() = default;

int MisbehavingServer::Start()
{
    return _impl->Start();
}

void MisbehavingServer::Stop()
{
    _impl->Stop();
}

void MisbehavingServer::AwaitQuiet()
{
    _impl->AwaitQuiet();
}

std::string MisbehavingServer::Url() const
{
    return _impl->Url();
}

} // namespace DevSts
