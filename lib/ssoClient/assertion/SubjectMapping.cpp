#include "ssoClient/SubjectMapping.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/MappedSamlToken.h"
#include "ssoClient/assertion/principals.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <algorithm>
#include <iterator>

namespace SsoClient {

namespace {

std::string GetFirstValue(const AssertionFacts& facts, const boost::optional<std::string>& name)
{
    if (!name) {
        return {};
    }
    const std::vector<std::string> values = GeneralReader::GetTextValues(facts, *name);
    return values.empty() ? std::string() : values.front();
}

/** [SAML-CORE 2.5.1.4]: restrictions hold together, so only what all name is the audience. */
std::set<std::string> GetCommonAudience(const std::vector<AssertionAudience>& restrictions)
{
    if (restrictions.empty()) {
        return {};
    }
    std::set<std::string> common = restrictions.front();
    for (const AssertionAudience& restriction : restrictions) {
        std::set<std::string> both;
        std::set_intersection(
            common.begin(),
            common.end(),
            restriction.begin(),
            restriction.end(),
            std::inserter(both, both.end()));
        common.swap(both);
    }
    // An empty audience of a token means that it is not restricted, which would be the contrary.
    if (common.empty()) {
        throw ParseException("The audience restrictions have no audience in common");
    }
    return common;
}

std::vector<Delegate> GetDelegates(const AssertionFacts& facts, const SubjectMapping& mapping)
{
    std::vector<Delegate> chain;
    for (const AssertionDelegate& delegate : facts.conditions.delegates) {
        if (!delegate.delegationInstant) {
            throw ParseException("A delegate has no DelegationInstant");
        }
        chain.push_back(
            {GeneralReader::FindDelegate(delegate.nameId, mapping), *delegate.delegationInstant});
    }
    return chain;
}

} // namespace

boost::shared_ptr<const SamlToken> CreateSamlToken(
    const boost::shared_ptr<const VerifiedAssertion>& assertion, const SubjectMapping& mapping)
{
    if (!assertion) {
        throw Quillon::InvalidArgumentException("The assertion is null");
    }
    GeneralReader::CheckRules(mapping);
    const AssertionFacts& facts = assertion->GetFacts();
    return boost::make_shared<MappedSamlToken>(
        assertion,
        MappedFacts{
            GeneralReader::FindSubject(facts, mapping),
            GeneralReader::FindGroups(facts, mapping),
            {GetFirstValue(facts, mapping.givenNameAttribute),
             GetFirstValue(facts, mapping.surnameAttribute)},
            GetDelegates(facts, mapping),
            GetCommonAudience(facts.conditions.audienceRestrictions)});
}

boost::shared_ptr<const VerifiedAssertion> GetAssertion(const SamlToken& token)
{
    const auto* mapped = dynamic_cast<const MappedSamlToken*>(&token);
    return mapped == nullptr ? boost::shared_ptr<const VerifiedAssertion>()
                             : mapped->GetAssertion();
}

} // namespace SsoClient
