#include "devsts/http/Server.h"

#include "devsts/http/Connections.h"
#include "devsts/service/TokenService.h"
#include "devsts/state/State.h"

#include <atomic>
#include <deque>
#include <httplib.h>
#include <mutex>
#include <openssl/ssl.h>
#include <set>
#include <stdexcept>
#include <sys/socket.h>
#include <thread>

namespace DevSts {

namespace {

constexpr const char* Path = "/sts";
constexpr std::size_t LargestRequest = 1U << 20U;
// One thread serves one connection for as long as it stays open.
constexpr std::size_t Threads = 128;
constexpr time_t IdleSeconds = 5;
constexpr std::size_t RequestsPerConnection = 1000000;

constexpr int StatusNotFound = 404;
constexpr int StatusMethodNotAllowed = 405;
constexpr int StatusUnsupportedMediaType = 415;

bool IsXml(const std::string& contentType)
{
    const std::string type = contentType.substr(0, contentType.find(';'));
    return strcasecmp(type.c_str(), "text/xml") == 0;
}

ReceivedRequest ToReceived(const httplib::Request& request)
{
    ReceivedRequest received;
    received.method = request.method;
    received.path = request.path;
    received.headers.insert(request.headers.begin(), request.headers.end());
    received.body = request.body;
    return received;
}

void CopyReply(const Reply& reply, httplib::Response& response)
{
    response.status = reply.status;
    for (const auto& [name, value] : reply.headers) {
        response.headers.emplace(name, value);
    }
    response.set_content(reply.body, reply.contentType);
}

NegotiatorOptions ToNegotiatorOptions(const Options& options)
{
    NegotiatorOptions negotiation;
    negotiation.keytab = options.keytab;
    // With the other files: it holds for every server that shares them, and for no other.
    negotiation.replays = options.stateDir / "kerberos.replays";
    negotiation.mostPending = options.pendingNegotiations;
    // [RFC6265 4.1.2]
    negotiation.cookieAttributes =
        std::string("; Path=") + Path + "; HttpOnly" + (options.plainHttp ? "" : "; Secure");
    return negotiation;
}

Reply PlainReply(int status, const std::string& text)
{
    Reply reply;
    reply.status = status;
    reply.contentType = "text/plain";
    reply.body = text + "\n";
    return reply;
}

} // namespace

class Server::Impl
{
public:
    explicit Impl(Options options)
        : _options(std::move(options))
        , _state(_options.stateDir)
        , _service(_state, _options.clock, ToNegotiatorOptions(_options))
    {}

    ~Impl() { Stop(); }

    int Start()
    {
        MakeHttpServer();
        _port = _options.port == 0
                    ? _http->bind_to_any_port(_options.host)
                    : (_http->bind_to_port(_options.host, _options.port) ? _options.port : -1);
        if (_port <= 0) {
            throw std::runtime_error(
                "Cannot listen on " + _options.host + ":" + std::to_string(_options.port));
        }
        _address = IpAddress::Local(_listener);
        // The HTTP library listens with room for five; a second call makes more.
        listen(_listener, SOMAXCONN);
        _thread = std::thread([this] { _http->listen_after_bind(); });
        // The HTTP server ignores a stop that comes before its loop runs.
        while (!_http->is_running()) {
            std::this_thread::yield();
        }
        return _port;
    }

    void Stop()
    {
        if (_thread.joinable()) {
            _http->stop();
            EndReading(_address, BusyPorts());
            _thread.join();
        }
    }

    std::string Url() const
    {
        const bool isIpv6 = _options.host.find(':') != std::string::npos;
        return std::string(_options.plainHttp ? "http" : "https") + "://"
               + (isIpv6 ? "[" + _options.host + "]" : _options.host) + ":" + std::to_string(_port)
               + Path;
    }

    void SetDelay(std::chrono::milliseconds delay) { _delay = delay; }

    void OnNextReply(ReplyHook hook)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _hooks.push_back(std::move(hook));
    }

    std::vector<ReceivedRequest> ReceivedRequests() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return {_received.begin(), _received.end()};
    }

private:
    void MakeHttpServer()
    {
        if (_options.plainHttp) {
            _http = std::make_unique<httplib::Server>();
        } else {
            _http = std::make_unique<httplib::SSLServer>(
                [this](SSL_CTX& context) { return SetUpTls(context); });
        }
        if (!_http->is_valid()) {
            throw std::runtime_error("The TLS certificate cannot be used");
        }
        const auto answer = [this](const httplib::Request& request, httplib::Response& response) {
            Answer(request, response);
        };
        _http->Get(".*", answer);
        _http->Post(".*", answer);
        _http->Put(".*", answer);
        _http->Delete(".*", answer);
        // The library logs once an answer is written.
        _http->set_logger([this](const httplib::Request& request, const httplib::Response&) {
            const std::lock_guard<std::mutex> lock(_mutex);
            _busyPorts.erase(request.remote_port);
        });
        _http->set_payload_max_length(LargestRequest);
        _http->set_keep_alive_max_count(RequestsPerConnection);
        _http->set_keep_alive_timeout(IdleSeconds);
        _http->set_tcp_nodelay(true);
        _http->set_socket_options([this](socket_t listener) { SetUpListener(listener); });
        _http->new_task_queue = [] {
            return std::make_unique<httplib::ThreadPool>(Threads).release();
        };
    }

    // A port is taken over from a server that has ended, but never shared with one that runs.
    void SetUpListener(socket_t listener)
    {
        const int yes = 1;
        setsockopt(listener, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
        _listener = listener;
    }

    bool SetUpTls(SSL_CTX& context)
    {
        const State::TlsIdentity identity = _state.IssueTlsIdentity(_options.host);
        return SSL_CTX_set_min_proto_version(&context, TLS1_2_VERSION) == 1
               && SSL_CTX_use_certificate(&context, identity.certificate.get()) == 1
               && SSL_CTX_use_PrivateKey(&context, identity.key.get()) == 1;
    }

    void Answer(const httplib::Request& request, httplib::Response& response)
    {
        const ReceivedRequest received = ToReceived(request);
        const ReplyHook hook = Remember(received, request.remote_port);
        std::this_thread::sleep_for(_delay.load());
        Reply reply = MakeReply(received);
        if (hook) {
            hook(received, reply);
        }
        CopyReply(reply, response);
    }

    // Gives the hook that was set for this request, if any.
    ReplyHook Remember(const ReceivedRequest& received, int port)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _busyPorts.insert(port);
        _received.push_back(received);
        while (_received.size() > _options.keptRequests) {
            _received.pop_front();
        }
        if (_hooks.empty()) {
            return nullptr;
        }
        ReplyHook hook = std::move(_hooks.front());
        _hooks.pop_front();
        return hook;
    }

    std::set<int> BusyPorts() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _busyPorts;
    }

    Reply MakeReply(const ReceivedRequest& received)
    {
        if (received.path != Path) {
            return PlainReply(StatusNotFound, std::string("Requests go to ") + Path);
        }
        if (received.method != "POST") {
            return PlainReply(StatusMethodNotAllowed, "Requests are POSTed");
        }
        const auto contentType = received.headers.find("Content-Type");
        if (contentType == received.headers.end() || !IsXml(contentType->second)) {
            return PlainReply(StatusUnsupportedMediaType, "The Content-Type must be text/xml");
        }
        return _service.Answer(received);
    }

    const Options _options;
    const State _state;
    TokenService _service;
    std::unique_ptr<httplib::Server> _http;
    std::thread _thread;
    int _port = 0;
    socket_t _listener = INVALID_SOCKET;
    IpAddress _address;
    std::atomic<std::chrono::milliseconds> _delay{std::chrono::milliseconds(0)};
    mutable std::mutex _mutex;
    std::set<int> _busyPorts; ///< whence the requests came that are not answered yet
    std::deque<ReplyHook> _hooks;
    std::deque<ReceivedRequest> _received;
};

Server::Server(Options options)
    : _impl(std::make_unique<Impl>(std::move(options)))
{}

Server::~Server() = default;

int Server::Start()
{
    return _impl->Start();
}

void Server::Stop()
{
    _impl->Stop();
}

std::string Server::Url() const
{
    return _impl->Url();
}

void Server::SetDelay(std::chrono::milliseconds delay)
{
    _impl->SetDelay(delay);
}

void Server::OnNextReply(ReplyHook hook)
{
    _impl->OnNextReply(std::move(hook));
}

std::vector<ReceivedRequest> Server::ReceivedRequests() const
{
    return _impl->ReceivedRequests();
}

} // namespace DevSts
