#pragma once

#include "ssoClient/client/Call.h"
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

    const std::string& GetId() const noexcept { return _opId; }

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
 * @param control   what the service's options say; null without.
 * @param describe  makes the line that says what is asked for; called only if it is logged.
 * @return what `perform` returns, which is given the call.
 */
template <class Describe, class Perform>
auto Run(
    const CallControl* control,
    const char* operationName,
    const Describe& describe,
    const Perform& perform)
{
    const OperationFrame frame(operationName);
    LogTrace(describe);
    Call call(control, frame.GetId(), operationName);
    return call.Report([&] { return perform(call); });
}

/** The way of an operation: to the service, and back. */
struct Road
{
    const CallControl* control;
    const Transport& transport;
    const boost::shared_ptr<const ResponseHandler>& responseHandler;
};

/**
 * Runs an operation of one exchange, in a session of its own that is over before the reply is read.
 *
 * @param build  fills the request; nothing is connected before it is done.
 * @return what `read` makes of the reply, with the handler that it is given.
 */
template <class Describe, class Build, class Read>
auto Run(
    const Road& road,
    const char* operationName,
    const Describe& describe,
    const Build& build,
    const Read& read)
{
    return Run(road.control, operationName, describe, [&](Call& call) {
        const Quillon::Ref<Quillon::Reader> reply = call.Attempt(Repeat::IF_NOT_ACTED_ON, [&] {
            road.transport.RequireUsable();
            Request request;
            build(request);
            return Send(*call.CreateSession(road.transport), request);
        });
        return read(*call.Observe(road.responseHandler), reply.get());
    });
}

} // namespace SsoClient
