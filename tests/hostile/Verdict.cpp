#include "Verdict.h"

#include "quillon/Exceptions.h"
#include "quillon/system/Clock.h"
#include "quillon/xml/Parser.h"
#include "ssoClient/CreateSamlToken.h"
#include "support/FixedClock.h"

#include <boost/core/demangle.hpp>

#include <algorithm>
#include <sstream>
#include <typeinfo>

namespace HostileTests {

namespace {

std::string QuoteId(const SsoClient::PrincipalId& id)
{
    return Quote(id.GetName()) + " in " + Quote(id.GetDomain());
}

void DescribeAttribute(const SsoClient::AdviceAttribute& attribute, std::ostream& out)
{
    out << "  " << Quote(attribute.name) << ":";
    for (const std::string& value : attribute.values) {
        out << " " << Quote(value);
    }
    out << "\n";
}

void DescribeAdvice(const SsoClient::SamlToken& token, std::ostream& out)
{
    std::vector<SsoClient::Advice> advices{SsoClient::Advice{"left over", {}}};
    token.GetAdvice(advices);
    for (const SsoClient::Advice& advice : advices) {
        out << "advice: " << Quote(advice.source) << "\n";
        for (const SsoClient::AdviceAttribute& attribute : advice.attributes) {
            DescribeAttribute(attribute, out);
        }
    }
}

void DescribeLists(const SsoClient::SamlToken& token, std::ostream& out)
{
    // What the containers hold before must be gone afterwards.
    std::vector<SsoClient::PrincipalId> groups{SsoClient::PrincipalId("left", "over")};
    token.GetGroups(groups);
    for (const SsoClient::PrincipalId& group : groups) {
        out << "group: " << QuoteId(group) << "\n";
    }
    std::vector<SsoClient::Delegate> chain;
    token.GetDelegationChain(chain);
    for (const SsoClient::Delegate& delegate : chain) {
        out << "delegate: " << QuoteId(delegate.subject) << " at "
            << delegate.delegationDate.GetUtcTime() << "\n";
    }
    std::set<std::string> audience{"left over"};
    token.GetAudience(audience);
    for (const std::string& name : audience) {
        out << "audience: " << Quote(name) << "\n";
    }
}

template <class GetFacts>
Verdict GetVerdict(const Conditions& conditions, const GetFacts& getFacts)
{
    const FixedClock clock(Quillon::System::DateTimeFromUtc(conditions.nowMicros, false));
    Verdict verdict;
    try {
        verdict.facts = getFacts();
    } catch (const Quillon::Exception& error) {
        verdict.className = boost::core::demangle(typeid(error).name());
        verdict.message = error.what();
    }
    return verdict;
}

bool Matches(const Verdict& verdict, const Refusal& refusal)
{
    const bool anyClass = refusal.className == "Quillon::Exception";
    return !verdict.IsAccepted() && (anyClass || verdict.className == refusal.className)
           && (refusal.message.empty() || verdict.message == refusal.message)
           && verdict.message.rfind(refusal.prefix, 0) == 0
           && verdict.message.find(refusal.contains) != std::string::npos;
}

} // namespace

std::string Quote(const std::string& text)
{
    std::ostringstream out;
    out << '"';
    for (const char character : text) {
        if (character == '"' || character == '\\') {
            out << '\\' << character;
        } else if (static_cast<unsigned char>(character) < ' ') {
            out << '\\' << static_cast<int>(character) << ';';
        } else {
            out << character;
        }
    }
    out << '"';
    return out.str();
}

std::string DescribeFacts(const SsoClient::SamlToken& token)
{
    std::pair<std::string, std::string> fullName("left", "over");
    token.GetFullName(fullName);
    std::ostringstream out;
    out << "id: " << Quote(token.GetId()) << "\n"
        << "subject: " << QuoteId(token.GetSubject()) << "\n"
        << "name: " << Quote(fullName.first) << " " << Quote(fullName.second) << "\n"
        << "valid: " << token.GetStartDate().GetUtcTime() << " to "
        << token.GetEndDate().GetUtcTime() << "\n"
        << "renewable " << token.IsRenewable() << ", delegable " << token.IsDelegable()
        << ", solution " << token.IsSolution() << ", confirmation " << token.GetConfirmationMethod()
        << "\n";
    if (const auto* certificate = token.GetConfirmationCertificate()) {
        out << "certificate: " << certificate->GetFingerprint() << "\n";
    }
    DescribeLists(token, out);
    DescribeAdvice(token, out);
    return out.str();
}

Verdict Judge(const std::string& xml, const Conditions& conditions)
{
    return GetVerdict(conditions, [&] {
        const auto token =
            SsoClient::CreateSamlToken(xml, conditions.trusted, conditions.toleranceSec);
        return DescribeFacts(*token)
               + (token->ToXml() == xml ? "" : "its XML is not what was given\n");
    });
}

Verdict JudgeInDom(const std::string& xml, const Conditions& conditions)
{
    return GetVerdict(conditions, [&] {
        const auto handler = Quillon::Xml::CreateXMLDocumentHandler();
        Quillon::Xml::CreateXMLParser(handler.get())->Parse(xml);
        return DescribeFacts(*SsoClient::CreateSamlTokenFromDom(
            handler->GetDocument()->GetRootElement(), conditions.trusted, conditions.toleranceSec));
    });
}

bool IsAmong(const Verdict& verdict, const std::vector<Refusal>& refusals)
{
    return std::any_of(refusals.begin(), refusals.end(), [&verdict](const Refusal& refusal) {
        return Matches(verdict, refusal);
    });
}

std::string Describe(const Verdict& verdict)
{
    return verdict.IsAccepted() ? "accepted:\n" + *verdict.facts
                                : verdict.className + ": " + Quote(verdict.message);
}

std::string Describe(const std::vector<Refusal>& refusals)
{
    std::string text;
    for (const Refusal& refusal : refusals) {
        text += (text.empty() ? "" : " or ") + refusal.className;
        text += refusal.message.empty() ? "" : ": " + Quote(refusal.message);
        text += refusal.prefix.empty() ? "" : " beginning " + Quote(refusal.prefix);
        text += refusal.contains.empty() ? "" : " containing " + Quote(refusal.contains);
    }
    return text;
}

} // namespace HostileTests
