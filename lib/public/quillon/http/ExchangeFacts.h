#pragma once

#include "quillon/Export.h"
#include "quillon/crypto/Certificate.h"
#include "quillon/system/DateTime.h"

#include <boost/function.hpp>
#include <boost/optional.hpp>

#include <list>
#include <string>

namespace Quillon::Http {

/**
 * When the steps of an exchange were done, in microseconds since it began; 0 if it did not get
 * there, or had nothing to do because the connection was open already.
 */
struct ExchangeTimes
{
    long long nameLookup = 0;
    long long connection = 0; ///< of TCP
    long long handshake = 0;  ///< of TLS
    long long firstByte = 0;  ///< of the reply
    long long end = 0;
};

/** What became known of an exchange until it ended, well or not. All texts are the server's. */
struct ExchangeFacts
{
    std::string server;  ///< the host and port that were asked for, as texts of failures name them
    std::string path;    ///< the request target, with a query if there is one
    std::string address; ///< IP address and port of the peer; empty without a connection
    ExchangeTimes times;

    std::string tlsVersion; ///< for example `TLSv1.3`; empty if it was not agreed upon
    std::string tlsCipher;
    /**
     * The certificates that the server showed, its own first, whether they were accepted or not.
     * Without those that cannot be decoded, and empty if the TLS session was resumed.
     */
    std::list<Ref<const Crypto::Certificate>> certificates;

    bool isConnectionReused = false; ///< whether the connection was there already
    bool isSessionResumed = false;   ///< whether the connection took up an earlier TLS session
    bool isSent = false;             ///< whether the request, or a part of it, went out
    long long sentOctets = 0;        ///< of the request's body
    long long receivedOctets = 0;    ///< of the reply's body, as it came

    int status = 0;                         ///< of the reply; 0 without one
    std::string location;                   ///< where the reply redirects to [RFC 9110 10.2.2]
    boost::optional<System::DateTime> date; ///< by the server's clock [RFC 9110 6.6.1]
    /** In how many seconds to come again, by the reply's own clock [RFC 9110 10.2.3]. */
    boost::optional<long long> retryAfterSeconds;
    std::string failure; ///< the text of the exception that the exchange ends with
};

/**
 * Told of an exchange that has ended, before anybody else is: on the I/O thread of the HTTP client,
 * which does nothing else meanwhile. What it throws is dropped. It is not told of an exchange that
 * was called off.
 */
using ExchangeObserver = boost::function<void(const ExchangeFacts&)>;

} // namespace Quillon::Http
