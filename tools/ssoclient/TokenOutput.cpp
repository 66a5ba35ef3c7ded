#include "TokenOutput.h"

#include "Arguments.h"
#include "ExitCode.h"
#include "Issuer.h"
#include "OneLine.h"
#include "Terminal.h"

#include "ssoClient/Descriptions.h"
#include "ssoClient/Exceptions.h"

#include <nlohmann/json.hpp>

#include <iostream>

using Json = nlohmann::ordered_json;

namespace {

Json ToJson(const SsoClient::PrincipalId& principal)
{
    return {{"name", principal.GetName()}, {"domain", principal.GetDomain()}};
}

Json ToJson(const SsoClient::Delegate& delegate)
{
    Json json = {{"subject", ToJson(delegate.subject)}};
    json["delegationDate"] = delegate.delegationDate.ToString();
    return json;
}

Json ToJson(const SsoClient::Advice& advice)
{
    Json json = {{"source", advice.source}, {"attributes", Json::array()}};
    for (const SsoClient::AdviceAttribute& attribute : advice.attributes) {
        json["attributes"].push_back({{"name", attribute.name}, {"values", attribute.values}});
    }
    return json;
}

template <class Item>
Json ToJson(const std::vector<Item>& items)
{
    Json list = Json::array();
    for (const Item& item : items) {
        list.push_back(ToJson(item));
    }
    return list;
}

Json ToJson(const Quillon::Crypto::Certificate* certificate)
{
    if (certificate == nullptr) {
        return {};
    }
    return {{"subject", certificate->GetSubjectName()}, {"sha256", certificate->GetFingerprint()}};
}

template <class Fact>
Json Collect(const SsoClient::SamlToken& token, void (SsoClient::SamlToken::*get)(Fact&) const)
{
    Fact fact;
    (token.*get)(fact);
    return ToJson(fact);
}

/**
 * What the redacted description says, under the same names, and what a caller must check before it
 * relies on the token. It is all ASCII, because a name may hold what would steer a terminal.
 */
std::string CreateJsonDescription(const SsoClient::SamlToken& token)
{
    using SsoClient::SamlToken;
    std::set<std::string> audience;
    token.GetAudience(audience);
    const bool isBearer = token.GetConfirmationMethod() == SamlToken::CONFIRM_BEARER;

    Json json;
    json["subject"] = ToJson(token.GetSubject());
    json["groups"] = Collect(token, &SamlToken::GetGroups);
    json["delegationChain"] = Collect(token, &SamlToken::GetDelegationChain);
    json["startTime"] = token.GetStartDate().ToString();
    json["expirationTime"] = token.GetEndDate().ToString();
    json["renewable"] = token.IsRenewable();
    json["delegable"] = token.IsDelegable();
    json["isSolution"] = token.IsSolution();
    json["confirmationType"] = isBearer ? "bearer" : "holder-of-key";
    json["id"] = token.GetId();
    json["issuer"] = FindIssuer(token);
    json["audience"] = audience;
    json["advice"] = Collect(token, &SamlToken::GetAdvice);
    json["confirmationCertificate"] = ToJson(token.GetConfirmationCertificate());
    return json.dump(2, ' ', true);
}

} // namespace

void OutputOptions::AddOutTo(const Command& command)
{
    obtains = true;
    command.InGroup("What is printed")
        .AddOption(
            "--out",
            outFile,
            "Write the assertion to this file (mode 0600), - for standard output; the description "
            "goes to standard error then")
        .Check(CheckNotEmpty)
        .ValueName("FILE");
}

TokenOutput::TokenOutput(const OutputOptions& options, const Presentation& presentation)
    : _options(options)
    , _presentation(presentation)
{
    if (!options.outFile.empty() && !ToStandardOutput()) {
        _file.emplace(options.outFile);
    }
}

void TokenOutput::Print(const std::string& text)
{
    if (!(std::cout << text << std::flush)) {
        throw UsageError("cannot write to standard output");
    }
}

bool TokenOutput::ToStandardOutput() const
{
    return _options.outFile == "-";
}

void TokenOutput::Show(const boost::shared_ptr<const SsoClient::SamlToken>& token)
{
    if (!token) {
        throw SsoClient::SsoException("The token service answered without a token");
    }
    if (_file) {
        _file->Write(token->ToXml());
    } else if (ToStandardOutput()) {
        Print(token->ToXml());
    }
    if (!_presentation.quiet) {
        Describe(*token);
    }
    if (_options.obtains && _options.outFile.empty() && _presentation.HasReader()) {
        Notice("the token is not kept: use --out FILE to keep it");
    }
}

void TokenOutput::Describe(const SsoClient::SamlToken& token) const
{
    const std::string line = _presentation.json
                                 ? CreateJsonDescription(token)
                                 : ToOneLine(SsoClient::CreateRedactedDescription(token));
    if (ToStandardOutput()) {
        std::cerr << line + "\n" << std::flush;
    } else {
        Print(line + "\n");
    }
}

void ShowValidity(bool isValid, const Presentation& presentation)
{
    if (presentation.quiet) {
        return;
    }
    if (presentation.json) {
        TokenOutput::Print(Json{{"valid", isValid}}.dump() + "\n");
    } else {
        TokenOutput::Print(isValid ? "valid\n" : "invalid\n");
    }
}
