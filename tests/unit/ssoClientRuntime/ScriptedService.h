#pragma once

#include "VirtualEnvironment.h"

#include "support/FakeSamlToken.h"

#include "quillon/http/HttpException.h"
#include "quillon/service/Logger.h"
#include "ssoClient/SecurityTokenService.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <functional>
#include <string>
#include <vector>

namespace Testing {

using Token = boost::shared_ptr<const SsoClient::SamlToken>;

inline Quillon::System::DateTime After(const Quillon::System::DateTime& time, SsoClient::Span span)
{
    return Quillon::System::DateTimeFromUtc(time.GetUtcTime() + span.count(), false);
}

/** Issues tokens by the clock of an environment, and does before that what the test says. */
class ScriptedService final : public SsoClient::SecurityTokenService
{
public:
    using Span = SsoClient::Span;

    explicit ScriptedService(boost::shared_ptr<VirtualEnvironment> environment)
        : _environment(std::move(environment))
    {}

    Span lifetime = std::chrono::hours(1);
    Span clockAhead{};
    Quillon::Ref<const Quillon::Crypto::Certificate> holder; ///< makes tokens renewable
    std::function<void()> before = [] {};                    ///< each operation

    std::function<void(const std::string&)> seePassword = [](const std::string&) {};

    std::vector<std::string> calls; ///< with all but passwords
    int underWay = 0;
    int mostUnderWay = 0;

    Token AcquireToken(
        const std::string& userName,
        const std::string& password,
        const SsoClient::TokenSpec& /*spec*/) const override
    {
        seePassword(password);
        return Issue("password " + userName);
    }
    Token AcquireTokenByGSS(
        const SsoClient::TokenSpec& /*spec*/, SsoClient::NegotiationHandler& handler) const override
    {
        handler.Negotiate(SsoClient::Leg());
        return Issue("gss");
    }
    Token AcquireTokenByCertificate(const SsoClient::TokenSpec& /*spec*/) const override
    {
        return Issue("certificate");
    }
    Token AcquireTokenByToken(
        const SsoClient::SamlToken& token, const SsoClient::TokenSpec& /*spec*/) const override
    {
        return Issue("exchange " + token.GetId());
    }
    Token RenewToken(const SsoClient::SamlToken& token, long long lifetimeSec) const override
    {
        return Issue("renew " + token.GetId() + " for " + std::to_string(lifetimeSec));
    }
    bool ValidateSubject(const SsoClient::SamlToken& /*token*/) const override { return true; }

    // Nothing here calls these.
    void AcquireTokenAsync(
        const std::string&,
        const std::string&,
        const SsoClient::TokenSpec&,
        const SsoClient::TokenCompletion&) const override
    {}
    void AcquireTokenByGssAsync(
        const SsoClient::TokenSpec&,
        const boost::shared_ptr<SsoClient::NegotiationHandler>&,
        const SsoClient::TokenCompletion&) const override
    {}
    void AcquireTokenByCertificateAsync(
        const SsoClient::TokenSpec&, const SsoClient::TokenCompletion&) const override
    {}
    void AcquireTokenByTokenAsync(
        const Token&, const SsoClient::TokenSpec&, const SsoClient::TokenCompletion&) const override
    {}
    void ValidateSubjectAsync(const Token&, const SsoClient::ValidationCompletion&) const override
    {}
    void RenewTokenAsync(const Token&, long long, const SsoClient::TokenCompletion&) const override
    {}

    Token Issue(const std::string& call) const
    {
        return const_cast<ScriptedService*>(this)->Do(call);
    }

private:
    Token Do(const std::string& call)
    {
        calls.push_back(call);
        mostUnderWay = std::max(mostUnderWay, ++underWay);
        const std::shared_ptr<int> leave(&underWay, [](int* count) { --*count; });
        const auto token = boost::make_shared<FakeSamlToken>();
        token->id = "_" + std::to_string(calls.size());
        const std::function<void()> now = before; // which may be given another one meanwhile
        now();
        token->startDate = After(_environment->GetWallTime(), clockAhead);
        token->endDate = After(token->startDate, lifetime);
        token->renewable = holder != nullptr;
        token->certificate = holder;
        token->confirmationMethod =
            holder ? FakeSamlToken::CONFIRM_HOLDER_OF_KEY : FakeSamlToken::CONFIRM_BEARER;
        return token;
    }

    boost::shared_ptr<VirtualEnvironment> _environment;
};

} // namespace Testing
