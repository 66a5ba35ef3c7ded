#include "TokenOutput.h"

#include "Arguments.h"
#include "ExitCode.h"
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

template <class Item>
Json ToJson(const std::vector<Item>& items)
{
    Json list = Json::array();
    for (const Item& item : items) {
        list.push_back(ToJson(item));
    }
    return list;
}

/**
 * What the redacted description says, under the same names; nothing more. It is all ASCII, because
 * a name may hold what would steer a terminal.
 */
std::string CreateJsonDescription(const SsoClient::SamlToken& token)
{
    std::vector<SsoClient::PrincipalId> groups;
    token.GetGroups(groups);
    std::vector<SsoClient::Delegate> delegationChain;
    token.GetDelegationChain(delegationChain);
    const bool isBearer = token.GetConfirmationMethod() == SsoClient::SamlToken::CONFIRM_BEARER;

    Json json;
    json["subject"] = ToJson(token.GetSubject());
    json["groups"] = ToJson(groups);
    json["delegationChain"] = ToJson(delegationChain);
    json["startTime"] = token.GetStartDate().ToString();
    json["expirationTime"] = token.GetEndDate().ToString();
    json["renewable"] = token.IsRenewable();
    json["delegable"] = token.IsDelegable();
    json["isSolution"] = token.IsSolution();
    json["confirmationType"] = isBearer ? "bearer" : "holder-of-key";
    return json.dump(2, ' ', true);
}

void Print(const std::string& text)
{
    if (!(std::cout << text << std::flush)) {
        throw UsageError("cannot write to standard output");
    }
}

} // namespace

void OutputOptions::AddJsonTo(const Command& command)
{
    command.AddFlag("--json", json, "Print the token's facts as JSON");
}

void OutputOptions::AddOutTo(const Command& command)
{
    obtains = true;
    command
        .AddOption(
            "--out",
            outFile,
            "Write the assertion to this file (mode 0600), - for standard output; the description "
            "goes to standard error then")
        .Check(CheckNotEmpty)
        .ValueName("FILE");
}

TokenOutput::TokenOutput(const OutputOptions& options)
    : _options(options)
{
    if (!options.outFile.empty() && !ToStandardOutput()) {
        _file.emplace(options.outFile);
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
    Describe(*token);
    if (_options.obtains && _options.outFile.empty() && IsTerminal()) {
        Notice("the token is not kept: use --out FILE to keep it");
    }
}

void TokenOutput::Describe(const SsoClient::SamlToken& token) const
{
    const std::string line = _options.json ? CreateJsonDescription(token)
                                           : ToOneLine(SsoClient::CreateRedactedDescription(token));
    if (ToStandardOutput()) {
        std::cerr << line + "\n" << std::flush;
    } else {
        PrintLine(line);
    }
}

void PrintLine(const std::string& line)
{
    Print(line + "\n");
}
