#pragma once

#include "ssoClient/SamlToken.h"

/** A token that says what the test wants, and counts how often it is asked for its description. */
class FakeSamlToken final : public SsoClient::SamlToken
{
public:
    std::string id = "_fake";
    Quillon::System::DateTime startDate{"2011-07-05T09:00:00Z"};
    Quillon::System::DateTime endDate{"2011-07-05T10:00:00Z"};
    SsoClient::PrincipalId subject{"jdoe", "example.com"};
    bool renewable = false;
    bool delegable = false;
    bool solution = false;
    ConfirmationType confirmationMethod = CONFIRM_BEARER;
    std::vector<SsoClient::PrincipalId> groups;
    std::vector<SsoClient::Delegate> delegationChain;
    std::set<std::string> audience{"secret-audience"};
    Quillon::Ref<const Quillon::Crypto::Certificate> certificate;
    std::string xml;

    mutable int subjectReads = 0;

    const std::string& GetId() const override { return id; }
    const Quillon::System::DateTime& GetStartDate() const override { return startDate; }
    const Quillon::System::DateTime& GetEndDate() const override { return endDate; }
    const SsoClient::PrincipalId& GetSubject() const override
    {
        ++subjectReads;
        return subject;
    }
    bool IsRenewable() const override { return renewable; }
    bool IsDelegable() const override { return delegable; }
    bool IsSolution() const override { return solution; }
    ConfirmationType GetConfirmationMethod() const override { return confirmationMethod; }
    void GetFullName(std::pair<std::string, std::string>& out) const override { out = {}; }
    void GetGroups(std::vector<SsoClient::PrincipalId>& out) const override { out = groups; }
    void GetDelegationChain(std::vector<SsoClient::Delegate>& out) const override
    {
        out = delegationChain;
    }
    void GetAudience(std::set<std::string>& out) const override { out = audience; }
    void GetAdvice(std::vector<SsoClient::Advice>& out) const override
    {
        out = {{"secret-advice", {}}};
    }
    const Quillon::Crypto::Certificate* GetConfirmationCertificate() const override
    {
        return certificate.get();
    }
    const std::string& ToXml() const override { return xml; }
};
