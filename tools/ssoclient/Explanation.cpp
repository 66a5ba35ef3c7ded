#include "Explanation.h"

#include "Duration.h"
#include "Issuer.h"
#include "OneLine.h"

#include "quillon/MessageFormatter.h"
#include "quillon/system/Clock.h"

using Quillon::MessageFormatter;
using Quillon::Crypto::Certificate;
using SsoClient::SamlToken;

namespace {

/** A token outside its validity has been verified only if the clock tolerance allows it. */
std::string DescribeValidity(const SamlToken& token)
{
    const long long now = Quillon::System::GetUtcDateTime().GetUtcTime();
    const long long start = token.GetStartDate().GetUtcTime();
    const long long end = token.GetEndDate().GetUtcTime();
    if (now < start) {
        return "begins in " + DescribeDuration(start - now) + ", which the clock tolerance allows";
    }
    if (now >= end) {
        return "ended " + DescribeDuration(now - end) + " ago, which the clock tolerance allows";
    }
    return DescribeDuration(end - now) + " left, until " + token.GetEndDate().ToString();
}

std::string Describe(const SsoClient::PrincipalId& principal)
{
    return principal.GetName() + "@" + principal.GetDomain();
}

std::string Describe(const Certificate& certificate)
{
    return MessageFormatter::ASPrint(
        "%1 (SHA-256 %2)", certificate.GetSubjectName(), certificate.GetFingerprint());
}

std::string DescribeConfirmation(const SamlToken& token)
{
    const Certificate* holder = token.GetConfirmationCertificate();
    return holder == nullptr ? "bearer: whoever has the token is its subject"
                             : "holder of the key of " + Describe(*holder);
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

std::vector<ExplainedFact> ExplainFacts(const SamlToken& token, const Certificate* signer)
{
    return {
        {"validity", {DescribeValidity(token)}},
        {"signed by", {signer == nullptr ? "unknown" : Describe(*signer)}},
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
