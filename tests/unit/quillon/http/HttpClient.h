#pragma once

#include "quillon/http/UserAgent.h"
#include "support/TestServer.h"

#include <chrono>
#include <future>
#include <string>

namespace Testing {

constexpr long long Generous = 60'000'000; ///< a time-out that no passing test reaches
constexpr long long Short = 50'000;        ///< a time-out that a test waits for

/** Whether what a test waits for comes within a time that only a lost event takes. */
inline bool HasHappened(std::promise<void>& event)
{
    return event.get_future().wait_for(std::chrono::seconds(10)) == std::future_status::ready;
}

/** What an `InvalidArgumentException` of `action` says; empty if there is none. */
template <class Action>
std::string GetArgumentError(const Action& action)
{
    try {
        action();
    } catch (const Quillon::InvalidArgumentException& error) {
        return error.what();
    }
    return "";
}

/** What a test wants to know of a reply. */
struct Reply
{
    int code = 0;
    std::string reason;
    std::string body;
};

inline std::string ReadAll(Quillon::Reader& reader)
{
    std::string text;
    char buffer[4096];
    while (const std::size_t count = reader.Read(buffer, sizeof buffer)) {
        text.append(buffer, count);
    }
    return text;
}

inline Reply ToReply(const Quillon::Http::ClientResponse& response)
{
    const Quillon::Http::HttpStatus& status = response.GetStatus();
    return {status.code, status.reasonPhrase, ReadAll(*response.GetBody())};
}

inline Quillon::Ref<Quillon::Http::ConnectionSpec> MakeTcpSpec(
    const TestServer& server, const std::string& host = "127.0.0.1")
{
    Quillon::Ref<Quillon::Http::ConnectionSpec> spec;
    Quillon::Http::CreateTCPConnectionSpec(host, server.GetPort(), false, spec);
    return spec;
}

/** A user agent with the means to send small requests. */
class HttpClient
{
public:
    explicit HttpClient(
        const Quillon::Ref<Quillon::Http::ConnectionSpec>& spec,
        Quillon::Http::HttpConnectionPool* pool = nullptr)
    {
        Quillon::Ref<Quillon::Http::CookieStore> cookies;
        Quillon::Http::CreateCookieStore("", cookies);
        Quillon::Http::CreateHttpUserAgent(spec.get(), cookies.get(), pool, _agent);
    }
    explicit HttpClient(const TestServer& server)
        : HttpClient(MakeTcpSpec(server))
    {}

    static Quillon::Ref<Quillon::Http::ClientRequest> MakeRequest(
        const std::string& body = "ping", const std::string& path = "/")
    {
        Quillon::Ref<Quillon::Http::ClientRequest> request;
        Quillon::Http::CreateHttpRequest(Quillon::Http::HttpMethod::POST, path, request);
        request->SetHeader("Content-Type", "text/xml");
        request->GetBodyWriter()->Write(body.data(), body.size());
        request->SetTimeout(Generous);
        return request;
    }

    Quillon::Ref<Quillon::Http::PendingRequestItem> Start(
        const Quillon::Ref<Quillon::Http::ClientRequest>& request,
        const Quillon::Http::Completion& completion = Quillon::Http::Completion())
    {
        Quillon::Ref<Quillon::Http::PendingRequestItem> pending;
        _agent->SendRequestAsync(request.get(), completion, pending);
        return pending;
    }

    Reply Wait(Quillon::Http::PendingRequestItem& pending, long long timeout = Generous)
    {
        Quillon::Ref<Quillon::Http::ClientResponse> response;
        _agent->WaitForResponse(&pending, timeout, response);
        return ToReply(*response);
    }

    Reply Post(const Quillon::Ref<Quillon::Http::ClientRequest>& request = MakeRequest())
    {
        return Wait(*Start(request));
    }

    /** The text of the exception that an exchange ends with; empty if it succeeds. */
    std::string PostAndFail(
        const Quillon::Ref<Quillon::Http::ClientRequest>& request = MakeRequest())
    {
        try {
            Post(request);
        } catch (const Quillon::Http::HttpException& error) {
            return error.what();
        }
        return "";
    }

private:
    Quillon::Ref<Quillon::Http::UserAgent> _agent;
};

inline std::string Describe(const TestServer& server, const std::string& host = "127.0.0.1")
{
    return host + " port " + std::to_string(server.GetPort());
}

} // namespace Testing
