#include "quillon/xml/Parser.h"
#include "ssoClient/Assertion.h"
#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/assertionReading.h"
#include "ssoClient/assertion/decryption.h"
#include "ssoClient/assertion/encryptionReading.h"
#include "ssoClient/assertion/judging.h"
#include "ssoClient/wire/wireNames.h"
#include "ssoClient/wire/xmlReading.h"

#include <algorithm>
#include <tuple>

namespace SsoClient {

using Quillon::Ref;
using Quillon::Crypto::Certificate;
using Quillon::Xml::ElementNode;
namespace Security = Quillon::Xml::Security;

namespace {

using Certificates = std::list<Ref<const Certificate>>;

void RequireAssertion(const ElementNode& root)
{
    if (!root.HasQName("Assertion", Wire::SamlNamespace)) {
        throw ParseException(
            "Expected element 'Assertion' of SAML 2.0, found " + GeneralReader::Describe(root));
    }
}

void Verify(const Security::Signature& signature, const Certificates& trusted)
{
    const auto resolver = Security::CreateTrustSetKeyResolver(trusted);
    bool verified = false;
    try {
        verified = signature.Verify(resolver.get());
    } catch (const Security::XmlSecurityException& error) {
        throw InvalidSignatureException(
            std::string("Signature verification error. ") + error.what());
    }
    if (!verified) {
        throw InvalidSignatureException(
            "Failed to verify signature: token might have been tampered with.");
    }
}

} // namespace

bool operator==(const AssertionNameId& a, const AssertionNameId& b)
{
    return std::tie(a.value, a.format, a.nameQualifier, a.spNameQualifier, a.spProvidedId)
           == std::tie(b.value, b.format, b.nameQualifier, b.spNameQualifier, b.spProvidedId);
}

bool VerifiedAssertion::IsFor(const std::string& audience) const
{
    const auto& restrictions = _facts.conditions.audienceRestrictions;
    return std::all_of(
        restrictions.begin(), restrictions.end(), [&audience](const AssertionAudience& named) {
            return named.count(audience) != 0;
        });
}

const AssertionAttribute* VerifiedAssertion::FindAttribute(const std::string& name) const noexcept
{
    const auto found = std::find_if(
        _facts.attributes.begin(), _facts.attributes.end(), [&name](const auto& attribute) {
            return attribute.name == name;
        });
    return found == _facts.attributes.end() ? nullptr : &*found;
}

/** Makes verified assertions; nobody else can. */
class AssertionVerifier
{
public:
    static boost::shared_ptr<const VerifiedAssertion> Verify(
        const std::string& xml, const Certificates& trusted, const AssertionRules& rules)
    {
        GeneralReader::RequireDecryptionKeys(rules.decryptionKeys);
        Ref<Quillon::Xml::Document> document;
        ParseXML(xml, document);
        ElementNode& root = *document->GetRootElement();
        if (GeneralReader::IsEncrypted(root)) {
            const Quillon::Wiped text = GeneralReader::DecryptAssertion(root, rules.decryptionKeys);
            return VerifyDecrypted(text.Get(), trusted, rules);
        }
        return Verify(root, xml, trusted, rules);
    }

private:
    /** Lines and columns are those of a text that the caller does not see: the failure says so. */
    static boost::shared_ptr<const VerifiedAssertion> VerifyDecrypted(
        const std::string& xml, const Certificates& trusted, const AssertionRules& rules)
    {
        const std::string where = "In what was encrypted: ";
        try {
            Ref<Quillon::Xml::Document> document;
            ParseXML(xml, document);
            return Verify(*document->GetRootElement(), xml, trusted, rules);
        } catch (const Quillon::Xml::XMLParseException& error) {
            throw Quillon::Xml::XMLParseException(where + error.what());
        } catch (const ParseException& error) {
            throw ParseException(where + error.what());
        }
    }

    static boost::shared_ptr<const VerifiedAssertion> Verify(
        ElementNode& root,
        const std::string& xml,
        const Certificates& trusted,
        const AssertionRules& rules)
    {
        RequireAssertion(root);
        const Ref<Security::Signature> signature = GeneralReader::FindSignature(root);
        SsoClient::Verify(*signature, trusted);

        const boost::shared_ptr<VerifiedAssertion> assertion(new VerifiedAssertion);
        assertion->_facts = GeneralReader::ReadAssertion(root, *signature);
        const auto judgement = GeneralReader::Judge(assertion->_facts, rules);
        assertion->_confirmation = judgement.confirmation;
        assertion->_startDate = judgement.startDate;
        assertion->_endDate = judgement.endDate;
        assertion->_xml = xml;
        return assertion;
    }
};

boost::shared_ptr<const VerifiedAssertion> VerifyAssertion(
    const std::string& xml,
    const std::list<Ref<const Certificate>>& trustedCertificates,
    const AssertionRules& rules)
{
    return AssertionVerifier::Verify(xml, trustedCertificates, rules);
}

} // namespace SsoClient
