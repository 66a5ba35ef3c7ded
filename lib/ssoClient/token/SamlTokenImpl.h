#pragma once

#include "quillon/Ref.h"
#include "quillon/xml/Node.h"
#include "quillon/xml/security/Signature.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/token/samlAssertion.h"

#include <boost/scoped_ptr.hpp>

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/**
 * A token that was read, found valid at the time of its construction and verified. Construction
 * fails with the exceptions of `CreateSamlToken`; `keyResolver` is used only meanwhile.
 */
class SSOCLIENT_API SamlTokenImpl final : public SamlToken
{
public:
    /** Keeps `xml` as it is given. */
    SamlTokenImpl(
        const std::string& xml,
        const Quillon::Xml::Security::KeyInfoResolver* keyResolver,
        long long clockToleranceSec);

    /** Keeps the canonical form of `assertion`, not the tree. */
    SamlTokenImpl(
        Quillon::Xml::ElementNode* assertion,
        const Quillon::Xml::Security::KeyInfoResolver* keyResolver,
        long long clockToleranceSec);

    const std::string& GetId() const override { return _id; }
    const Quillon::System::DateTime& GetStartDate() const override { return _startDate; }
    const Quillon::System::DateTime& GetEndDate() const override { return _endDate; }
    const PrincipalId& GetSubject() const override { return *_subject; }
    bool IsRenewable() const override { return _isRenewable; }
    bool IsDelegable() const override { return _isDelegable; }
    bool IsSolution() const override { return _isSolution; }
    ConfirmationType GetConfirmationMethod() const override { return _confirmationMethod; }
    void GetFullName(std::pair<std::string, std::string>& out) const override { out = _fullName; }
    void GetGroups(std::vector<PrincipalId>& out) const override;
    void GetDelegationChain(std::vector<Delegate>& out) const override { out = _delegationChain; }
    void GetAudience(std::set<std::string>& out) const override { out = _audience; }
    void GetAdvice(std::vector<Advice>& out) const override { out = _advice; }
    const Quillon::Crypto::Certificate* GetConfirmationCertificate() const override
    {
        return _confirmationCertificate.get();
    }
    const std::string& ToXml() const override { return _xml; }

private:
    void InitializeFromDom(
        Quillon::Xml::ElementNode* assertion,
        const Quillon::Xml::Security::KeyInfoResolver* keyResolver,
        long long clockToleranceSec);
    void Populate(SamlAssertionType& assertion);
    void PopulateTokenAttribute(AttributeType& attribute);
    void AppendGroups(std::vector<std::string>& values);

    std::string _xml;
    std::string _id;
    Quillon::System::DateTime _startDate;
    Quillon::System::DateTime _endDate;
    boost::scoped_ptr<const PrincipalId> _subject;
    bool _isRenewable = false;
    bool _isDelegable = false;
    bool _isSolution = false;
    std::pair<std::string, std::string> _fullName; // given name, surname
    std::vector<std::string> _groups;              // as they are written
    std::vector<Delegate> _delegationChain;
    std::set<std::string> _audience;
    std::vector<Advice> _advice;
    ConfirmationType _confirmationMethod = CONFIRM_BEARER;
    Quillon::Ref<const Quillon::Crypto::Certificate> _confirmationCertificate;
};

/** Judges what does not need the signature: version, ID, times and delegation. */
SSOCLIENT_API void CheckTokenProperties(
    const SamlAssertionType& assertion, long long clockToleranceSec);

/** Splits `name@domain` at the last `@`. */
SSOCLIENT_API PrincipalId ParseSamlNameId(const NameIDType& nameId);

/** Splits `DOMAIN\group` at the first backslash. */
SSOCLIENT_API PrincipalId ParseGroupIdentity(const std::string& value);

SSOCLIENT_API Delegate ParseToDelegate(const DelegateType& delegate);
SSOCLIENT_API bool ParseIsSolutionAttribute(const AttributeType& attribute);

/** The first value, or nothing. */
SSOCLIENT_API std::string ParsePrincipalNameAttribute(const AttributeType& attribute);

SSOCLIENT_API bool SamlAttributeIsGroupIdentity(const AttributeType& attribute);
SSOCLIENT_API bool SamlAttributeIsSolution(const AttributeType& attribute);
SSOCLIENT_API bool SamlAttributeIsGivenName(const AttributeType& attribute);
SSOCLIENT_API bool SamlAttributeIsSurName(const AttributeType& attribute);

} // namespace SsoClient
