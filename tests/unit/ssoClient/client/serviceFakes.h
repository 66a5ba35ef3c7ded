#pragma once

#include "quillon/Exceptions.h"
#include "ssoClient/protocol/ResponseHandler.h"
#include "ssoClient/protocol/Transport.h"
#include "support/TestData.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gtest/gtest.h>

#include <deque>
#include <functional>
#include <string>
#include <utility>
#include <vector>

/**
 * A transport that throws `failure` if there is one, or else answers every request with the next
 * of `replies`, and then with `reply`.
 */
class FakeTransport final : public SsoClient::Transport
{
public:
    std::string reply;
    mutable std::deque<std::string> replies;
    boost::shared_ptr<Quillon::Exception> failure;

    mutable std::vector<SsoClient::Request> sent;
    mutable int sessionsMade = 0;
    mutable int sessionsAlive = 0;

    /** Called with what the call says of its session before a request is answered; may be empty. */
    std::function<void(const SsoClient::SessionOptions&)> onSend;
    mutable boost::optional<SsoClient::ConnectionReuse> reuse;

    boost::shared_ptr<SsoClient::TransportSession> CreateSession() const override
    {
        return CreateControlledSession({});
    }

    boost::shared_ptr<SsoClient::TransportSession> CreateControlledSession(
        const SsoClient::SessionOptions& options) const override
    {
        return boost::make_shared<Session>(*this, options);
    }

    /** This one, which the tests keep. */
    boost::shared_ptr<const SsoClient::Transport> WithReuse(
        const boost::optional<SsoClient::ConnectionReuse>& connectionReuse) const override
    {
        reuse = connectionReuse;
        return {boost::shared_ptr<const SsoClient::Transport>(), this};
    }

private:
    class Session final : public SsoClient::TransportSession
    {
    public:
        Session(const FakeTransport& transport, const SsoClient::SessionOptions& options)
            : _transport(transport)
            , _options(options)
        {
            ++_transport.sessionsMade;
            ++_transport.sessionsAlive;
        }
        ~Session() { --_transport.sessionsAlive; }

        void SendRequest(
            const SsoClient::Request& request, Quillon::Ref<Quillon::Reader>& response) override
        {
            _transport.sent.push_back(request);
            if (_transport.onSend) {
                _transport.onSend(_options);
            }
            if (_transport.failure) {
                _transport.failure->Throw();
            }
            response = Quillon::CreateStringReader(_transport.TakeReply());
        }

        void SendRequestAsync(
            const SsoClient::Request&,
            const SsoClient::ResponseCallback&,
            Quillon::Ref<Quillon::System::ScheduledItem>&) override
        {
            FAIL() << "A blocking operation sent asynchronously.";
        }

    private:
        const FakeTransport& _transport;
        const SsoClient::SessionOptions _options;
    };

    std::string TakeReply() const
    {
        if (replies.empty()) {
            return reply;
        }
        std::string next = std::move(replies.front());
        replies.pop_front();
        return next;
    }
};

/** A response handler that takes the whole reply for the assertion. */
class ReplyIsToken final : public SsoClient::ResponseHandler
{
public:
    explicit ReplyIsToken(const FakeTransport& transport)
        : _transport(transport)
    {}

    mutable int sessionsAliveWhenCalled = -1;

    void HandleAcquireTokenResponse(Quillon::Reader* body, std::string& tokenXml) const override
    {
        sessionsAliveWhenCalled = _transport.sessionsAlive;
        char buffer[1024];
        while (const std::size_t size = body->Read(buffer, sizeof(buffer))) {
            tokenXml.append(buffer, size);
        }
    }

    bool HandleValidateSubjectResponse(Quillon::Reader*) const override { return false; }

    void HandleRenewTokenResponse(Quillon::Reader* body, std::string& tokenXml) const override
    {
        HandleAcquireTokenResponse(body, tokenXml);
    }

    void HandleSPNegoResponse(Quillon::Reader*, SsoClient::SPNegoResponse&) const override
    {
        FAIL() << "An operation without negotiation negotiated.";
    }

    boost::shared_ptr<const SsoClient::ResponseHandler> ShowingFaultsTo(
        const SsoClient::FaultObserver&) const override
    {
        return {boost::shared_ptr<const SsoClient::ResponseHandler>(), this};
    }

private:
    const FakeTransport& _transport;
};

/** A signed bearer assertion that is valid at `WhenTokensAreValid`. */
inline std::string GetSignedAssertion()
{
    return ReadTestData("tokens/accepted/bearer.xml");
}
inline constexpr char WhenTokensAreValid[] = "2026-06-15T12:00:00Z";

/** A regular expression for the whole line that begins or ends an operation. */
inline std::string FrameLinePattern(const std::string& step, const std::string& operation)
{
    return "^SsoClient\\[64\\]: opId="
           "[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12} "
           + step + " operation SecurityTokenServiceImpl::" + operation + "$";
}

inline std::string GetOpId(const std::string& line)
{
    const std::size_t start = line.find("opId=");
    return line.substr(start, line.find(' ', start) - start);
}
