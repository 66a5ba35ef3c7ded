#include "ssoClient/client/descriptions.h"

#include "quillon/MessageFormatter.h"

#include <boost/algorithm/string/join.hpp>

using Quillon::MessageFormatter;

namespace SsoClient {

std::string WriteDelegate(const Delegate* delegate)
{
    return delegate->subject.ToString() + " at " + delegate->delegationDate.ToString();
}

std::string WriteAdviceAttribute(const AdviceAttribute* attribute)
{
    return MessageFormatter::ASPrint(
        "[source=%1, attributes=[%2]]",
        attribute->name,
        boost::algorithm::join(attribute->values, ", "));
}

std::string WriteAdvice(const Advice* advice)
{
    return MessageFormatter::ASPrint(
        "Advice [source=%1, attributes=[%2]]",
        advice->source,
        AsString<AdviceAttribute>(advice->attributes, WriteAdviceAttribute));
}

std::string WriteTokenSpec(const TokenSpec& spec)
{
    return MessageFormatter::ASPrint(
        "TokenSpec [tokenLifetimeSec=%1, delegable=%2, delegateTo=%3, renewable=%4, "
        "confirmationType=%5,audienceRestriction=%6, advice=[%7]",
        spec.tokenLifetimeSec,
        spec.delegable,
        spec.delegateTo.get_value_or("<unset>"),
        spec.renewable,
        static_cast<int>(spec.confirmation),
        boost::algorithm::join(spec.audienceRestriction, ", "),
        AsString<Advice>(spec.advice, WriteAdvice));
}

std::string CreateRedactedDescription(const SamlToken& token)
{
    std::vector<PrincipalId> groups;
    token.GetGroups(groups);
    std::vector<Delegate> delegationChain;
    token.GetDelegationChain(delegationChain);
    return MessageFormatter::ASPrint(
        "SamlToken [subject=%1, groups=[%2], delegationChain=[%3], startTime=%4, "
        "expirationTime=%5, renewable=%6, delegable=%7, isSolution=%8,confirmationType=%9]",
        token.GetSubject(),
        AsString<PrincipalId>(groups, &PrincipalId::ToString),
        AsString<Delegate>(delegationChain, WriteDelegate),
        token.GetStartDate(),
        token.GetEndDate(),
        token.IsRenewable(),
        token.IsDelegable(),
        token.IsSolution(),
        static_cast<int>(token.GetConfirmationMethod()));
}

} // namespace SsoClient
