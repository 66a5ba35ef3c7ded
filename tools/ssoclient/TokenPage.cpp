#include "TokenPage.h"

#include "OneLine.h"

#include <string_view>

using SsoClient::SamlToken;

namespace {

constexpr std::string_view Style =
    "body{font:1rem/1.5 system-ui,sans-serif;margin:2rem auto;max-width:60rem;padding:0 1rem;"
    "color:#1b1b1b;background:#fff}"
    "h1{font-size:1.4rem;overflow-wrap:anywhere}"
    "dl{display:grid;grid-template-columns:10rem 1fr;gap:.5rem 1rem}"
    "dt{font-weight:600}"
    "dd{margin:0;overflow-wrap:anywhere;min-width:0}"
    "ul,ol{margin:0;padding-left:1.2rem}"
    "@media(max-width:40rem){dl{grid-template-columns:1fr;gap:0}dd{margin-bottom:.8rem}}";

/** Text between tags, and nothing that steers what shows it. */
std::string Escape(const std::string& text)
{
    std::string escaped;
    for (const char character : ToOneLine(text)) {
        switch (character) {
        case '&':
            escaped += "&amp;";
            break;
        case '<':
            escaped += "&lt;";
            break;
        case '>':
            escaped += "&gt;";
            break;
        case '"':
            escaped += "&quot;";
            break;
        case '\'':
            escaped += "&#39;";
            break;
        default:
            escaped += character;
        }
    }
    return escaped;
}

std::string WriteValues(const ExplainedFact& fact)
{
    if (fact.values.size() == 1) {
        return Escape(fact.values.front());
    }
    const std::string list = fact.isChain ? "ol" : "ul";
    std::string items;
    for (const std::string& value : fact.values) {
        items += "<li>" + Escape(value) + "</li>";
    }
    return fact.values.empty() ? "none" : "<" + list + ">" + items + "</" + list + ">";
}

std::string WriteFact(const ExplainedFact& fact)
{
    return "<dt>" + Escape(fact.name) + "</dt><dd>" + WriteValues(fact) + "</dd>\n";
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
    const std::string title =
        Escape("Token of " + token.GetSubject().GetName() + "@" + token.GetSubject().GetDomain());
    return "<!DOCTYPE html>\n<html lang=\"en\"><head><meta charset=\"utf-8\"/>\n"
           "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; style-src "
           "'unsafe-inline'\"/>\n"
           "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\"/>\n<title>"
           + title + "</title>\n<style>" + std::string(Style) + "</style></head>\n<body><h1>"
           + title + "</h1>\n<dl>\n" + rows + "</dl>\n</body></html>\n";
}
