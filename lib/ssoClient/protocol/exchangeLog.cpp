#include "ssoClient/protocol/exchangeLog.h"

#include "quillon/MessageFormatter.h"
#include "quillon/service/Logger.h"

using Quillon::MessageFormatter;
using Quillon::Http::ExchangeFacts;
using Quillon::Http::ExchangeTimes;

namespace SsoClient {

namespace {

/** A service may put megabytes into a fault. */
constexpr std::size_t MaxShownBytes = 500;

std::string Shorten(const std::string& text)
{
    return text.size() <= MaxShownBytes ? text : text.substr(0, MaxShownBytes) + "...";
}

Quillon::Service::Logger& GetExchangeLogger()
{
    // The facility keeps every logger for the life of the process.
    static Quillon::Service::Logger* const logger =
        Quillon::Service::GetApp()->GetLogFacility().GetLogger("SsoClient.Exchange").get();
    return *logger;
}

/** Without the query, which may carry what lets its reader in. */
std::string DescribeTarget(const std::string& path)
{
    const std::size_t query = path.find('?');
    return query == std::string::npos ? path : path.substr(0, query) + "?...";
}

void LogLine(const std::string& line)
{
    GetExchangeLogger().Log(Quillon::Service::LOG_LEVEL_TRACE, line);
}

std::string DescribeStep(const char* name, long long microseconds)
{
    return microseconds == 0
               ? ""
               : MessageFormatter::ASPrint(", %1 after %2 ms", name, microseconds / 1000);
}

std::string DescribeTimes(const ExchangeTimes& times)
{
    return DescribeStep("name looked up", times.nameLookup)
           + DescribeStep("connected", times.connection)
           + DescribeStep("TLS agreed", times.handshake)
           + DescribeStep("reply began", times.firstByte) + DescribeStep("ended", times.end);
}

std::string DescribeOutcome(const ExchangeFacts& facts)
{
    return facts.status == 0 ? "no reply"
                             : MessageFormatter::ASPrint("HTTP status %1", facts.status);
}

std::string DescribeCertificate(const ExchangeFacts& facts)
{
    if (facts.certificates.empty()) {
        return "no certificate shown";
    }
    const Quillon::Crypto::Certificate& own = *facts.certificates.front();
    return MessageFormatter::ASPrint(
        "certificate of %1, issued by %2, SHA-256 %3",
        Shorten(own.GetSubjectName()),
        Shorten(own.GetIssuerName()),
        own.GetFingerprint());
}

} // namespace

bool LogsExchanges()
{
    return GetExchangeLogger().IsEnabled(Quillon::Service::LOG_LEVEL_TRACE);
}

void LogExchange(const ExchangeFacts& facts)
{
    LogLine(MessageFormatter::ASPrint(
        "POST %1 to %2 (%3): %4%5",
        DescribeTarget(facts.path),
        facts.server,
        facts.address.empty() ? "no address" : facts.address,
        DescribeOutcome(facts),
        DescribeTimes(facts.times)));
    if (!facts.tlsVersion.empty()) {
        LogLine(MessageFormatter::ASPrint(
            "%1 with %2, %3", facts.tlsVersion, facts.tlsCipher, DescribeCertificate(facts)));
    }
}

void LogFault(const std::string& code, const std::string& text)
{
    if (LogsExchanges()) {
        LogLine(MessageFormatter::ASPrint(
            "SOAP fault with code `%1', text `%2'", Shorten(code), Shorten(text)));
    }
}

void LogGeneralToken(const std::string& nameFormat)
{
    LogLine(MessageFormatter::ASPrint(
        "the token would be read as a general assertion; the Format of its NameID is `%1'",
        Shorten(nameFormat)));
}

} // namespace SsoClient
