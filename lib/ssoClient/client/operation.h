#pragma once

#include "ssoClient/client/logging.h"
#include "ssoClient/protocol/Transport.h"

#include <string>

/** What all operations of the token service have in common. */
namespace SsoClient {

/** Marks the begin and, however it is left, the end of an operation in the log. */
class OperationFrame
{
public:
    explicit OperationFrame(std::string operationName);
    OperationFrame(const OperationFrame&) = delete;
    OperationFrame& operator=(const OperationFrame&) = delete;
    ~OperationFrame();

private:
    std::string Describe(const char* step) const;

    std::string _opId;
    std::string _operationName;
};

/** Sends a request, as every operation and every leg does. @return the reply. */
Quillon::Ref<Quillon::Reader> Send(TransportSession& session, const Request& request);

/**
 * Runs an operation. All of them come by here, so what surrounds every one stands here.
 *
 * @param describe  makes the line that says what is asked for; called only if it is logged.
 * @return what `perform` returns.
 */
template <class Describe, class Perform>
auto Run(const char* operationName, const Describe& describe, const Perform& perform)
{
    const OperationFrame frame(operationName);
    LogTrace(describe);
    return perform();
}

/**
 * Runs an operation of one exchange, in a session of its own that is over before the reply is read.
 *
 * @param build  fills the request; nothing is connected before it is done.
 * @return what `read` makes of the reply.
 */
template <class Describe, class Build, class Read>
auto Run(
    const Transport& transport,
    const char* operationName,
    const Describe& describe,
    const Build& build,
    const Read& read)
{
    return Run(operationName, describe, [&] {
        Request request;
        build(request);
        const Quillon::Ref<Quillon::Reader> reply = Send(*transport.CreateSession(), request);
        return read(reply.get());
    });
}

} // namespace SsoClient
