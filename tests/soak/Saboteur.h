#pragma once

#include <string>

#include <sys/types.h>

namespace Soak {

/** What goes wrong on the way to the service. */
enum class Sabotage
{
    RANDOM,     ///< now and then, of every kind
    HALF_HANGS, ///< on every second connection nothing ever comes
};

/**
 * A process between the client and the service, which lets most connections through and spoils the
 * others: it delays, cuts, resets and changes what comes back, or answers itself.
 */
class Saboteur
{
public:
    /** To be made before there are threads. */
    Saboteur(const std::string& serviceUrl, Sabotage sabotage, unsigned seed);
    Saboteur(const Saboteur&) = delete;
    Saboteur& operator=(const Saboteur&) = delete;
    ~Saboteur();

    /** Where the service is reached through it. */
    const std::string& GetUrl() const { return _url; }

private:
    pid_t _pid = 0;
    std::string _url;
};

} // namespace Soak
