#pragma once

#include "ssoClient/Assertion.h"
#include "ssoClient/SamlToken.h"

namespace SsoClient {

/** What a mapping makes of an assertion. */
struct MappedFacts
{
    PrincipalId subject;
    std::vector<PrincipalId> groups;
    std::pair<std::string, std::string> fullName; ///< given name, surname
    std::vector<Delegate> delegationChain;
    std::set<std::string> audience;
};

/** A token made of a general assertion, which it keeps. */
class MappedSamlToken final : public SamlToken
{
public:
    MappedSamlToken(boost::shared_ptr<const VerifiedAssertion> assertion, MappedFacts facts);

    const boost::shared_ptr<const VerifiedAssertion>& GetAssertion() const { return _assertion; }

    const std::string& GetId() const override { return _assertion->GetFacts().id; }
    const Quillon::System::DateTime& GetStartDate() const override
    {
        return _assertion->GetStartDate();
    }
    const Quillon::System::DateTime& GetEndDate() const override
    {
        return _assertion->GetEndDate();
    }
    const PrincipalId& GetSubject() const override { return _facts.subject; }
    bool IsRenewable() const override;
    bool IsDelegable() const override;
    bool IsSolution() const override { return false; }
    ConfirmationType GetConfirmationMethod() const override { return _method; }
    void GetFullName(std::pair<std::string, std::string>& out) const override
    {
        out = _facts.fullName;
    }
    void GetGroups(std::vector<PrincipalId>& out) const override { out = _facts.groups; }
    void GetDelegationChain(std::vector<Delegate>& out) const override
    {
        out = _facts.delegationChain;
    }
    void GetAudience(std::set<std::string>& out) const override { out = _facts.audience; }
    void GetAdvice(std::vector<Advice>& out) const override { out.clear(); }
    const Quillon::Crypto::Certificate* GetConfirmationCertificate() const override
    {
        return _certificate.get();
    }
    const std::string& ToXml() const override { return _assertion->ToXml(); }

private:
    boost::shared_ptr<const VerifiedAssertion> _assertion;
    MappedFacts _facts;
    ConfirmationType _method;
    Quillon::Ref<const Quillon::Crypto::Certificate> _certificate;
};

} // namespace SsoClient
