#include "fuzz/fuzzing.h"
#include "fuzz/scriptedConnection.h"
#include "quillon/http/HttpException.h"
#include "quillon/http/UserAgent.h"

#include <algorithm>

// Whatever octets a server sends, an exchange ends: with a reply within the limits, or with an
// exception that has a text. And what is left over of one reply is no part of the next.
//
// The octets go through the real engine. Its connections are made to be local pairs of sockets,
// whose other ends hold all that the server will ever say: `socket` and `connect` of the C library
// stand aside for those below.
namespace {

using namespace Quillon::Http;

constexpr char SecondReply[] = "HTTP/1.1 200 OK\r\nContent-Length: 6\r\n\r\nsecond";
constexpr std::size_t LargestText = 1'000;

struct Ended
{
    int status = 0; ///< 0 for an exception
    std::string text;
};

std::string ReadAll(Quillon::Reader& reader)
{
    std::string text;
    char buffer[4096];
    while (const std::size_t count = reader.Read(buffer, sizeof buffer)) {
        text.append(buffer, count);
    }
    return text;
}

Ended Post(UserAgent& agent, const std::string& reply)
{
    ScriptedConnection::Play(&reply);
    Quillon::Ref<ClientRequest> request;
    CreateHttpRequest(HttpMethod::POST, "/sts", request);
    request->GetBodyWriter()->Write("ping", 4);
    try {
        Quillon::Ref<PendingRequestItem> pending;
        agent.SendRequestAsync(request.get(), Completion(), pending);
        Quillon::Ref<ClientResponse> response;
        constexpr long long Generous = 30'000'000;
        agent.WaitForResponse(pending.get(), Generous, response);
        return {response->GetStatus().code, ReadAll(*response->GetBody())};
    } catch (const TimeoutException&) {
        Fuzzing::Require(false, "an exchange that does not end with its connection");
    } catch (const HttpException& error) {
        return {0, error.what()};
    }
    return {};
}

Quillon::Ref<UserAgent> MakeAgent()
{
    Quillon::Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec("127.0.0.1", 80, false, spec);
    Quillon::Ref<CookieStore> cookies;
    CreateCookieStore("", cookies);
    Quillon::Ref<UserAgent> agent;
    CreateHttpUserAgent(spec.get(), cookies.get(), nullptr, agent);
    return agent;
}

} // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string reply(
        Fuzzing::ToText(data, std::min(size, ScriptedConnection::LargestScript)));
    const Quillon::Ref<UserAgent> agent = MakeAgent();
    const Ended first = Post(*agent, reply);
    Fuzzing::Require(
        first.status == 0 ? !first.text.empty() && first.text.size() <= LargestText
                          : first.status >= 100 && first.status <= 999 && first.text.size() <= size,
        "an odd end: " + std::to_string(first.status) + " " + first.text.substr(0, LargestText));
    static const std::string secondReply = SecondReply;
    const Ended second = Post(*agent, secondReply);
    Fuzzing::Require(
        second.status == 200 && second.text == "second",
        "another second reply: " + std::to_string(second.status) + " " + second.text);
    ScriptedConnection::Play(nullptr);
    return 0;
}
