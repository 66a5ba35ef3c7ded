#include "ssoClient/client/operation.h"

#include "quillon/MessageFormatter.h"
#include "quillon/StringUtil.h"

#include <utility>

namespace SsoClient {

OperationFrame::OperationFrame(std::string operationName)
    : _opId(Quillon::StringUtil::GenerateUuid())
    , _operationName(std::move(operationName))
{
    LogTrace([this] { return Describe("START"); });
}

OperationFrame::~OperationFrame()
{
    try {
        LogTrace([this] { return Describe("END"); });
    } catch (const std::exception&) { // NOLINT(bugprone-empty-catch)
        // Out of memory for one log line; the operation has its own outcome to report.
    }
}

std::string OperationFrame::Describe(const char* step) const
{
    return Quillon::MessageFormatter::ASPrint(
        "opId=%1 %2 operation SecurityTokenServiceImpl::%3", _opId, step, _operationName);
}

Quillon::Ref<Quillon::Reader> Send(TransportSession& session, const Request& request)
{
    Quillon::Ref<Quillon::Reader> reply;
    session.SendRequest(request, reply);
    return reply;
}

} // namespace SsoClient
