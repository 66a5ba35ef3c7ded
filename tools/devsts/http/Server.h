#pragma once

#include "devsts/wire/Clock.h"
#include "devsts/wire/Messages.h"

#include <chrono>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace DevSts {

struct Options
{
    std::filesystem::path stateDir; ///< made and filled if missing; several servers may share it
    std::string host = "127.0.0.1"; ///< an address or a name, without brackets
    int port = 0;                   ///< 0: any free one
    bool plainHttp = false;
    Clock clock = SystemTime;
    std::filesystem::path keytab;           ///< negotiates with these keys; empty: not at all
    std::size_t pendingNegotiations = 1000; ///< the most that wait for their next leg
    std::size_t keptRequests = 100;         ///< how many requests ReceivedRequests remembers
};

/**
 * The development STS on a port of this machine. For development and tests only: its keys and
 * its users' passwords lie in plain files.
 *
 * Thread safety: Start and Stop are called by one thread; everything else by any number, also
 * while requests are answered.
 */
class Server
{
public:
    /** @throws std::runtime_error  the state directory or the keytab cannot be used. */
    explicit Server(Options options);

    /** Stops. */
    ~Server();

    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;

    /**
     * Serves from now on, on threads of its own.
     *
     * @return the port. @throws std::runtime_error  the address cannot be bound.
     */
    int Start();

    /** Answers the requests under way, closes idle connections, and ends. */
    void Stop();

    /** Where requests go; known once started. */
    std::string Url() const;

    /** Every request from now on waits this long before its answer. */
    void SetDelay(std::chrono::milliseconds delay);

    using ReplyHook = std::function<void(const ReceivedRequest&, Reply&)>;

    /**
     * Lets `hook` change the reply to the next request, whatever its method and path: status,
     * body, headers. It runs once, on the thread that answers; several hooks queue up.
     */
    void OnNextReply(ReplyHook hook);

    /** The most recent requests in order of arrival, refused ones and unknown paths included. */
    std::vector<ReceivedRequest> ReceivedRequests() const;

private:
    class Impl;
    std::unique_ptr<Impl> _impl;
};

} // namespace DevSts
