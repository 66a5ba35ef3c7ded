#include "Explanation.h"

#include "Duration.h"
#include "Issuer.h"
#include "OneLine.h"

#include "quillon/MessageFormatter.h"
#include "quillon/system/Clock.h"

using Quillon::MessageFormatter;
using Quillon::Crypto::Certificate;
using Quillon::System::DateTime;
using SsoClient::SamlToken;

namespace {

std::string Describe(const SsoClient::PrincipalId& principal)
{
    return principal.GetName() + "@" + principal.GetDomain();
}

std::string DescribeConfirmation(const SamlToken& token)
{
    const Certificate* holder = token.GetConfirmationCertificate();
    return holder == nullptr ? "bearer: whoever has the token is its subject"
                             : "holder of the key of " + DescribeCertificate(*holder);
}

std::vector<std::string> DescribeDelegation(const SamlToken& token)
{
    std::vector<SsoClient::Delegate> chain;
    token.GetDelegationChain(chain);
    if (chain.empty()) {
        return {"none"};
    }
    std::vector<std::string> links = {Describe(token.GetSubject())};
    for (const SsoClient::Delegate& delegate : chain) {
        links.push_back(
            Describe(delegate.subject) + " (" + delegate.delegationDate.ToString() + ")");
    }
    return links;
}

std::vector<std::string> DescribeAudience(const SamlToken& token)
{
    std::set<std::string> audience;
    token.GetAudience(audience);
    return audience.empty() ? std::vector<std::string>{"anyone"}
                            : std::vector<std::string>(audience.begin(), audience.end());
}

std::string ToLine(const ExplainedFact& fact)
{
    constexpr std::size_t NameWidth = 14;
    std::string name = fact.name + ":";
    name.resize(NameWidth, ' ');
    std::string values;
    for (const std::string& value : fact.values) {
        values += (values.empty() ? "" : fact.isChain ? " -> " : ", ") + value;
    }
    return "  " + name + ToOneLine(values) + "\n";
}

} // namespace

std::string DescribeValidity(const DateTime& startDate, const DateTime& endDate)
{
    const long long now = Quillon::System::GetUtcDateTime().GetUtcTime();
    const long long start = startDate.GetUtcTime();
    const long long end = endDate.GetUtcTime();
    if (now < start) {
        return "begins in " + DescribeDuration(start - now) + ", which the clock tolerance allows";
    }
    if (now >= end) {
        return "ended " + DescribeDuration(now - end) + " ago, which the clock tolerance allows";
    }
    return DescribeDuration(end - now) + " left, until " + endDate.ToString();
}

std::string DescribeCertificate(const Certificate& certificate)
{
    return MessageFormatter::ASPrint(
        "%1 (SHA-256 %2)", certificate.GetSubjectName(), certificate.GetFingerprint());
}

std::vector<ExplainedFact> ExplainFacts(const SamlToken& token, const Certificate* signer)
{
    return {
        {"validity", {DescribeValidity(token.GetStartDate(), token.GetEndDate())}},
        {"signed by", {signer == nullptr ? "unknown" : DescribeCertificate(*signer)}},
        {"issuer", {FindIssuer(token)}},
        {"confirmation", {DescribeConfirmation(token)}},
        {"audience", DescribeAudience(token)},
        {"delegation", DescribeDelegation(token), true}};
}

std::string Explain(const SamlToken& token, const Certificate* signer)
{
    std::string lines;
    for (const ExplainedFact& fact : ExplainFacts(token, signer)) {
        lines += ToLine(fact);
    }
    return lines;
}
