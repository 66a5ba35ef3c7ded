#include "TokenPage.h"

#include "html.h"

using SsoClient::SamlToken;

namespace {

std::string WriteValues(const ExplainedFact& fact)
{
    if (fact.values.size() == 1) {
        return EscapeForHtml(fact.values.front());
    }
    const std::string list = fact.isChain ? "ol" : "ul";
    std::string items;
    for (const std::string& value : fact.values) {
        items += "<li>" + EscapeForHtml(value) + "</li>";
    }
    return fact.values.empty() ? "none" : "<" + list + ">" + items + "</" + list + ">";
}

std::string WriteFact(const ExplainedFact& fact)
{
    return "<dt>" + EscapeForHtml(fact.name) + "</dt><dd>" + WriteValues(fact) + "</dd>\n";
}

ExplainedFact CollectGroups(const SamlToken& token)
{
    std::vector<SsoClient::PrincipalId> groups;
    token.GetGroups(groups);
    ExplainedFact fact = {"groups", {}};
    for (const SsoClient::PrincipalId& group : groups) {
        fact.values.push_back(group.GetName() + "@" + group.GetDomain());
    }
    return fact;
}

void CollectValues(
    const std::string& name, const std::vector<std::string>& values, ExplainedFact& fact)
{
    fact.values.reserve(fact.values.size() + values.size());
    for (const std::string& value : values) {
        fact.values.push_back(name);
        fact.values.back().append(" = ").append(value);
    }
}

ExplainedFact CollectAdvice(const SamlToken& token)
{
    std::vector<SsoClient::Advice> advice;
    token.GetAdvice(advice);
    ExplainedFact fact = {"advice", {}};
    for (const SsoClient::Advice& each : advice) {
        for (const SsoClient::AdviceAttribute& attribute : each.attributes) {
            CollectValues(each.source + ": " + attribute.name, attribute.values, fact);
        }
    }
    return fact;
}

ExplainedFact CollectFlags(const SamlToken& token)
{
    return {
        "properties",
        {token.IsRenewable() ? "renewable" : "not renewable",
         token.IsDelegable() ? "delegable" : "not delegable",
         token.IsSolution() ? "of a service" : "not of a service"}};
}

} // namespace

std::string WriteTokenPage(const SamlToken& token, const Quillon::Crypto::Certificate* signer)
{
    std::vector<ExplainedFact> facts = ExplainFacts(token, signer);
    facts.push_back(CollectGroups(token));
    facts.push_back(CollectFlags(token));
    facts.push_back(CollectAdvice(token));
    facts.push_back({"ID", {token.GetId()}});
    std::string rows;
    for (const ExplainedFact& fact : facts) {
        rows += WriteFact(fact);
    }
    const SsoClient::PrincipalId& subject = token.GetSubject();
    return WriteHtmlPage(
        "Token of " + subject.GetName() + "@" + subject.GetDomain(), "<dl>\n" + rows + "</dl>\n");
}
