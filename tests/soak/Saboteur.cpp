#include "Saboteur.h"

#include <arpa/inet.h>
#include <array>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstddef>
#include <netinet/in.h>
#include <optional>
#include <poll.h>
#include <random>
#include <stdexcept>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <utility>

namespace Soak {

namespace {

/** What is done to one connection. */
struct Fate
{
    bool hangs = false;
    bool isResetAtOnce = false;
    bool isResetInTheEnd = false;
    std::chrono::milliseconds delay{0};
    std::optional<std::size_t> cutAfter;  ///< octets of the reply
    std::optional<std::size_t> changedAt; ///< the place in the reply of an octet that is another
    const char* answer = nullptr;         ///< in place of the service's
};

constexpr const char* Answers[] = {
    "HTTP/1.1 503 Service Unavailable\r\nContent-Length: 0\r\nConnection: close\r\n\r\n",
    "HTTP/1.1 500 Internal Server Error\r\nContent-Type: text/xml\r\nConnection: close\r\n\r\n"
    "<E><Body><Fault><faultcode xmlns:s='http://schemas.xmlsoap.org/soap/envelope/'>s:Server"
    "</faultcode><faultstring>Out of order</faultstring></Fault></Body></E>",
    "HTTP/1.1 200 OK\r\nContent-Type: text/html\r\nConnection: close\r\n\r\n<p>Welcome<br>",
    "HTTP/1.1 404 Not Found\r\nContent-Length: 3\r\nConnection: close\r\n\r\nno\n",
    "SSH-2.0-OpenSSH_9.2\r\n",
    "HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\ntoo little",
};

/** One connection in five meets a sabotage. */
Fate DrawFate(std::mt19937& random)
{
    Fate fate;
    const auto draw = [&random](std::size_t count) {
        return std::uniform_int_distribution<std::size_t>(0, count - 1)(random);
    };
    switch (draw(30)) {
    case 0:
        fate.isResetAtOnce = true;
        break;
    case 1:
        fate.delay = std::chrono::milliseconds(draw(100));
        break;
    case 2:
        fate.cutAfter = draw(6000);
        break;
    case 3:
        fate.cutAfter = draw(6000);
        fate.isResetInTheEnd = true;
        break;
    case 4:
        fate.changedAt = draw(6000);
        break;
    case 5:
        fate.answer = Answers[draw(std::size(Answers))];
        break;
    default:
        break;
    }
    return fate;
}

class Socket
{
public:
    explicit Socket(int descriptor)
        : _descriptor(descriptor)
    {}
    Socket(const Socket&) = delete;
    Socket& operator=(const Socket&) = delete;
    ~Socket() { close(_descriptor); }

    int Get() const { return _descriptor; }

    void ResetAtClose() const
    {
        const linger atOnce{1, 0};
        setsockopt(_descriptor, SOL_SOCKET, SO_LINGER, &atOnce, sizeof atOnce);
    }

    bool Send(const char* data, std::size_t size) const
    {
        while (size > 0) {
            const ssize_t count = send(_descriptor, data, size, MSG_NOSIGNAL);
            if (count <= 0) {
                return false;
            }
            data += count;
            size -= static_cast<std::size_t>(count);
        }
        return true;
    }

private:
    int _descriptor;
};

sockaddr_in MakeAddress(int port)
{
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    return address;
}

/** Passes on what comes back, as the fate says. @return whether the connection goes on. */
bool PassBack(const Socket& client, Fate& fate, std::size_t& passed, char* data, std::size_t size)
{
    if (fate.changedAt && *fate.changedAt >= passed && *fate.changedAt < passed + size) {
        data[*fate.changedAt - passed] ^= 1;
    }
    const bool isCut = fate.cutAfter && passed + size > *fate.cutAfter;
    if (isCut) {
        size = *fate.cutAfter - passed;
    }
    passed += size;
    return client.Send(data, size) && !isCut;
}

void PassThrough(const Socket& client, const Socket& service, Fate& fate)
{
    std::array<char, 16384> data{};
    std::size_t passed = 0;
    for (bool goesOn = true; goesOn;) {
        std::array<pollfd, 2> ends{{{client.Get(), POLLIN, 0}, {service.Get(), POLLIN, 0}}};
        poll(ends.data(), ends.size(), -1);
        if (ends[0].revents != 0) {
            const ssize_t count = recv(client.Get(), data.data(), data.size(), 0);
            goesOn = count > 0 && service.Send(data.data(), static_cast<std::size_t>(count));
        } else {
            const ssize_t count = recv(service.Get(), data.data(), data.size(), 0);
            std::this_thread::sleep_for(std::exchange(fate.delay, {}));
            goesOn =
                count > 0
                && PassBack(client, fate, passed, data.data(), static_cast<std::size_t>(count));
        }
    }
}

void Serve(int accepted, int servicePort, Fate fate)
{
    const Socket client(accepted);
    std::array<char, 16384> data{};
    if (fate.isResetAtOnce || fate.isResetInTheEnd) {
        client.ResetAtClose();
    }
    if (fate.isResetAtOnce) {
        return;
    }
    while (fate.hangs && recv(client.Get(), data.data(), data.size(), 0) > 0) {
    }
    if (fate.answer != nullptr) {
        recv(client.Get(), data.data(), data.size(), 0);
        client.Send(fate.answer, std::char_traits<char>::length(fate.answer));
        return;
    }
    const Socket service(socket(AF_INET, SOCK_STREAM, 0));
    const sockaddr_in address = MakeAddress(servicePort);
    if (!fate.hangs
        && connect(service.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address)
               == 0) {
        PassThrough(client, service, fate);
    }
}

[[noreturn]] void Run(int listener, int servicePort, Sabotage sabotage, unsigned seed)
{
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    std::mt19937 random(seed);
    for (unsigned number = 0;; ++number) {
        const int accepted = accept(listener, nullptr, nullptr);
        if (accepted < 0) {
            continue; // no descriptor is free just now
        }
        Fate fate;
        if (sabotage == Sabotage::RANDOM) {
            fate = DrawFate(random);
        } else {
            fate.hangs = number % 2 == 1;
        }
        std::thread(&Serve, accepted, servicePort, fate).detach();
    }
}

} // namespace

Saboteur::Saboteur(const std::string& serviceUrl, Sabotage sabotage, unsigned seed)
{
    const std::size_t colon = serviceUrl.rfind(':');
    const int servicePort = std::stoi(serviceUrl.substr(colon + 1));
    const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address = MakeAddress(0);
    socklen_t size = sizeof address;
    if (bind(listener, reinterpret_cast<sockaddr*>(&address), size) != 0
        || listen(listener, SOMAXCONN) != 0
        || getsockname(listener, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
        throw std::runtime_error("cannot listen on the loopback");
    }
    _pid = fork();
    if (_pid == 0) {
        Run(listener, servicePort, sabotage, seed);
    }
    close(listener);
    _url = serviceUrl.substr(0, colon + 1) + std::to_string(ntohs(address.sin_port))
           + serviceUrl.substr(serviceUrl.rfind('/'));
}

Saboteur::~Saboteur()
{
    kill(_pid, SIGKILL);
    waitpid(_pid, nullptr, 0);
}

} // namespace Soak
