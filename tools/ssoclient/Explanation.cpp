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

std::string DescribeDelegation(const SamlToken& token)
{
    std::vector<SsoClient::Delegate> chain;
    token.GetDelegationChain(chain);
    if (chain.empty()) {
        return "none";
    }
    std::string text = Describe(token.GetSubject());
    for (const SsoClient::Delegate& delegate : chain) {
        text +=
            " -> " + Describe(delegate.subject) + " (" + delegate.delegationDate.ToString() + ")";
    }
    return text;
}

std::string DescribeAudience(const SamlToken& token)
{
    std::set<std::string> audience;
    token.GetAudience(audience);
    std::string text;
    for (const std::string& party : audience) {
        text += (text.empty() ? "" : ", ") + party;
    }
    return text.empty() ? "anyone" : text;
}

std::string ToLine(const std::string& name, const std::string& value)
{
    return "  " + name + ToOneLine(value) + "\n";
}

} // namespace

std::string Explain(const SamlToken& token, const Certificate* signer)
{
    return ToLine("validity:     ", DescribeValidity(token))
           + ToLine("signed by:    ", signer == nullptr ? "unknown" : Describe(*signer))
           + ToLine("issuer:       ", FindIssuer(token))
           + ToLine("confirmation: ", DescribeConfirmation(token))
           + ToLine("audience:     ", DescribeAudience(token))
           + ToLine("delegation:   ", DescribeDelegation(token));
}
