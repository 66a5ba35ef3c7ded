#pragma once

#include "FileDescriptor.h"

#include <chrono>
#include <functional>
#include <list>
#include <optional>
#include <string>
#include <vector>

#include <poll.h>

/** An address to listen at. */
struct ListenAddress
{
    std::string host; ///< a numeric one
    int port = 0;     ///< 0: any that is free
    bool isV6 = false;
    bool isLoopback = false;
};

/**
 * @param text  `HOST:PORT`, where the host is an IPv4 address, an IPv6 one in brackets, or
 *              `localhost`.
 * @return nothing if that is not what it is.
 */
std::optional<ListenAddress> ParseListenAddress(const std::string& text);

/**
 * Answers `GET /metrics` over HTTP/1.1, and refuses everything else. It belongs to the loop of
 * whoever has it, which waits for its descriptors: there is no thread, and nothing here waits. A
 * client has five seconds in all, and there are 16 at a time; one more takes the place of the
 * oldest, so that slow ones keep nobody out.
 */
class MetricsServer
{
public:
    using Clock = std::chrono::steady_clock;

    /**
     * @param describe  gives the metrics of the moment, in Prometheus's text format.
     * @throws UsageError  it cannot listen there.
     */
    MetricsServer(const ListenAddress& address, std::function<std::string()> describe);

    /** Where it listens: `http://HOST:PORT/metrics`. */
    const std::string& GetUrl() const noexcept { return _url; }

    /** Adds what is to be waited for. @return until when at the longest, if it matters. */
    std::optional<Clock::time_point> AddTo(std::vector<pollfd>& waits) const;

    /** Goes on with all clients as far as that is possible now. */
    void Serve();

private:
    struct Client
    {
        FileDescriptor socket;
        Clock::time_point end;
        std::string request;
        std::string reply; ///< what is left of it to be sent
        bool isAnswered = false;
        bool isOver = false;
    };

    void Accept();
    void Admit(FileDescriptor socket);
    void GoOn(Client& client) const;
    void Read(Client& client) const;
    std::string Answer(const std::string& request) const;

    std::function<std::string()> _describe;
    FileDescriptor _listener;
    std::string _url;
    std::list<Client> _clients; // the oldest first
    Clock::time_point _acceptsFrom = Clock::time_point::min();
};
