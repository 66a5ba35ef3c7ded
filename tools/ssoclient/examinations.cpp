#include "examinations.h"

#include "Duration.h"
#include "Hints.h"
#include "OneLine.h"

#include "quillon/MessageFormatter.h"
#include "quillon/http/ConnectionSpec.h"
#include "ssoClient/Exceptions.h"

#include <cstdlib>
#include <string_view>

using Quillon::MessageFormatter;
using Quillon::Crypto::Certificate;
using Quillon::Http::ExchangeFacts;
using Quillon::System::DateTime;

namespace {

constexpr long long MicrosPerSecond = 1'000'000;

/** Who renews certificates by hand needs some time. */
constexpr long long SoonMicros = 30LL * 86'400 * MicrosPerSecond;

/** Requests are valid for minutes, and the way takes some seconds. */
constexpr long long MaxClockMicros = 60 * MicrosPerSecond;

struct Validity
{
    Health health;
    std::string text;
};

Validity JudgeValidity(const Certificate& certificate, const DateTime& now)
{
    try {
        const long long left = certificate.GetNotAfter().GetUtcTime() - now.GetUtcTime();
        if (now < certificate.GetNotBefore()) {
            return {Health::BAD, "not valid before " + certificate.GetNotBefore().ToString()};
        }
        if (left < 0) {
            return {Health::BAD, "expired at " + certificate.GetNotAfter().ToString()};
        }
        return {
            left < SoonMicros ? Health::NOTE : Health::GOOD,
            "expires at " + certificate.GetNotAfter().ToString() + ", in "
                + DescribeDuration(left)};
    } catch (const Quillon::Crypto::CryptoException& error) {
        return {Health::BAD, error.what()};
    }
}

std::string Describe(const Certificate& certificate, const Validity& validity)
{
    return MessageFormatter::ASPrint(
        "%1, issued by %2, %3, SHA-256 %4",
        Shorten(certificate.GetSubjectName(), MaxShownBytes),
        Shorten(certificate.GetIssuerName(), MaxShownBytes),
        validity.text,
        certificate.GetFingerprint());
}

Finding ExamineShown(const Certificate& certificate, bool isOwn, const DateTime& now)
{
    const Validity validity = JudgeValidity(certificate, now);
    const std::string pin =
        isOwn ? ", pin (--peer) " + Quillon::Http::GetPin(certificate) : std::string();
    return {
        validity.health,
        "tls",
        (isOwn ? "shown: " : "shown above it: ") + Describe(certificate, validity) + pin,
        validity.health == Health::GOOD ? "" : "the server's operator must renew the certificate"};
}

std::string AdviseOn(const std::exception& failure, const std::optional<ExchangeFacts>& exchange)
{
    const std::string hint = FindHint(failure, exchange);
    return hint.empty() ? "docs/errors.md has what causes this, and what to do" : hint;
}

bool IsFault(const std::exception& failure)
{
    return std::string_view(failure.what()).rfind("Unexpected SOAP fault: ", 0) == 0;
}

} // namespace

std::vector<Finding> ExamineTrust(const CertificateList& trusted, const DateTime& now)
{
    std::vector<Finding> findings;
    for (const auto& certificate : trusted) {
        const Validity validity = JudgeValidity(*certificate, now);
        findings.push_back(
            {validity.health,
             "trust",
             Describe(*certificate, validity),
             validity.health == Health::GOOD ? ""
                                             : "ask the service's operator for the certificate "
                                               "that it signs tokens with next"});
    }
    if (trusted.empty()) {
        findings.push_back(
            {Health::NOTE,
             "trust",
             "no certificate is trusted to sign tokens",
             "get the service's signing certificate from its operator, for --trust"});
    }
    return findings;
}

bool FailedInTls(const ExchangeFacts& exchange)
{
    return exchange.status == 0 && exchange.times.handshake == 0;
}

std::vector<Finding> ExamineTls(
    const ExchangeFacts& exchange, const std::exception* failure, const DateTime& now)
{
    std::vector<Finding> findings;
    if (failure != nullptr && FailedInTls(exchange)) {
        findings.push_back({Health::BAD, "tls", failure->what(), AdviseOn(*failure, exchange)});
    } else {
        findings.push_back(
            {Health::GOOD, "tls", exchange.tlsVersion + " with " + exchange.tlsCipher, ""});
    }
    bool isOwn = true;
    for (const auto& certificate : exchange.certificates) {
        findings.push_back(ExamineShown(*certificate, isOwn, now));
        isOwn = false;
    }
    return findings;
}

Finding ExamineClock(const ExchangeFacts& exchange, const DateTime& now)
{
    if (!exchange.date) {
        return {Health::NOTE, "clock", "the reply does not tell the service's time", ""};
    }
    const long long ahead = now.GetUtcTime() - exchange.date->GetUtcTime();
    if (std::abs(ahead) <= MaxClockMicros) {
        return {Health::GOOD, "clock", "this machine's and the service's agree to a minute", ""};
    }
    return {
        Health::BAD,
        "clock",
        "this machine is " + DescribeDuration(std::abs(ahead))
            + (ahead > 0 ? " ahead of" : " behind") + " the service",
        "set the clock that is wrong: requests and tokens are valid for minutes"};
}

Finding ExamineAnswer(const std::optional<ExchangeFacts>& exchange, const std::exception* failure)
{
    if (failure == nullptr) {
        return {
            Health::BAD,
            "answer",
            "the service issued a token for a user that was made up",
            "do not use this service: it lets anybody in"};
    }
    const std::string text = Shorten(failure->what(), MaxShownBytes);
    if (dynamic_cast<const SsoClient::InvalidCredentialsException*>(failure) != nullptr) {
        return {
            Health::GOOD,
            "answer",
            "the service speaks WS-Trust and refuses a user that was made up: " + text,
            ""};
    }
    if (IsFault(*failure)) {
        return {
            Health::NOTE,
            "answer",
            "the service speaks SOAP and refuses the request of a user that was made up: " + text,
            "if it takes other credentials than passwords, that is in order; docs/errors.md lists "
            "the fault codes"};
    }
    return {Health::BAD, "answer", text, AdviseOn(*failure, exchange)};
}
