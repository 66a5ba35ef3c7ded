#include "ssoClientRuntime/attempts.h"

#include "quillon/http/HttpException.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/Exceptions.h"
#include "ssoClientRuntime/Exceptions.h"

#include <string>

namespace SsoClient {

namespace {

using Quillon::System::DateTime;

constexpr std::size_t MaxShownBytes = 500;

std::string Cut(const std::string& text)
{
    return text.size() <= MaxShownBytes ? text : text.substr(0, MaxShownBytes) + "...";
}

Span ToSpan(const DateTime& time)
{
    return Span(time.GetUtcTime());
}

std::string ToText(Span wall)
{
    return Quillon::System::DateTimeFromUtc(wall.count(), false).ToString();
}

/** @throws Quillon::Exception  there is none. */
DateTime ParseIssueInstant(const std::string& xml)
{
    const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
    Quillon::Xml::CreateXMLParser(handler.get())->Parse(xml);
    std::string text;
    handler->GetDocument()->GetRootElement()->GetAttribute("IssueInstant", text);
    return DateTime(text);
}

} // namespace

std::shared_ptr<const Quillon::Exception> Keep(const Quillon::Exception& failure)
{
    return std::shared_ptr<const Quillon::Exception>(failure.Clone());
}

Outcome Try(const std::function<boost::shared_ptr<const SamlToken>()>& acquire)
{
    try {
        Outcome outcome{acquire(), nullptr};
        if (outcome.token == nullptr) {
            outcome.failure = Keep(SsoException("The token service gave no token"));
        }
        return outcome;
    } catch (const Quillon::Exception& failure) {
        return {nullptr, Keep(failure)};
    } catch (const std::exception& failure) {
        return {
            nullptr, Keep(SsoException(Quillon::GetClassName(failure) + ": " + failure.what()))};
    } catch (...) {
        return {nullptr, Keep(SsoException("Something that is not an exception was thrown"))};
    }
}

FailureKind Classify(const Quillon::Exception& failure)
{
    const bool isTransient = dynamic_cast<const Quillon::Http::HttpException*>(&failure) != nullptr
                             || dynamic_cast<const CommunicationException*>(&failure) != nullptr
                             || dynamic_cast<const NoTokenException*>(&failure) != nullptr;
    return isTransient ? FailureKind::TRANSIENT : FailureKind::REFUSED;
}

Validity ReadValidity(const SamlToken& token)
{
    Validity validity{ToSpan(token.GetStartDate()), ToSpan(token.GetEndDate())};
    try {
        const Span issued = ToSpan(ParseIssueInstant(token.ToXml()));
        validity.issued = issued < validity.end ? issued : validity.issued;
    } catch (const Quillon::Exception&) { // NOLINT(bugprone-empty-catch): the start date stands in
    }
    return validity;
}

bool IsRenewableBy(const SamlToken& token, const Quillon::Crypto::Certificate* identity)
{
    const Quillon::Crypto::Certificate* holder = token.GetConfirmationCertificate();
    return token.IsRenewable() && token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY
           && identity != nullptr && holder != nullptr
           && holder->GetEncoded() == identity->GetEncoded();
}

std::shared_ptr<const Quillon::Exception> MakeTooEarly(const Validity& validity, const Moment& now)
{
    return Keep(InvalidTokenException(
        "The token that came was issued at " + ToText(validity.issued) + " and ends at "
        + ToText(validity.end) + ", which is too early at " + ToText(now.wall)));
}

Moment ReadClocks(const RuntimeEnvironment& environment)
{
    const auto steady = environment.GetSteadyTime().time_since_epoch();
    return {ToSpan(environment.GetWallTime()), std::chrono::duration_cast<Span>(steady)};
}

std::string DescribeFailure(const Quillon::Exception& failure)
{
    return Quillon::GetClassName(failure) + ": " + Cut(failure.what());
}

} // namespace SsoClient
