#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"
#include "quillon/system/DateTime.h"
#include "quillon/xml/QName.h"
#include "ssoClient/Export.h"

#include <boost/optional.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include <cstddef>
#include <list>
#include <set>
#include <string>
#include <vector>

/**
 * SAML 2.0 assertions of any producer, read in full [SAML-CORE 2]. `CreateSamlToken` reads the one
 * narrow shape that its token service issues, and stays the default; this is beside it.
 *
 * What is optional in SAML is a `boost::optional` here: absent is not the same as empty. Texts are
 * as they are written; only URIs that stand as an element's content are without the blanks around
 * them, which do not belong to a URI [XML Schema Part 2, 3.2.17].
 */
namespace SsoClient {

/** One attribute of an element kept as a tree. */
struct AssertionXmlAttribute
{
    Quillon::Xml::QName name;
    std::string value;
};

/**
 * A piece of an assertion that has no model of its own: an element or, with an empty local name,
 * the text between elements. It holds what the signature covers and nothing else: no comments, no
 * processing instructions, no namespace declarations.
 */
struct AssertionXml
{
    Quillon::Xml::QName name;
    std::vector<AssertionXmlAttribute> attributes;
    std::vector<AssertionXml> children;
    std::string text; ///< of a text

    bool IsElement() const noexcept { return !name.GetLocalName().empty(); }
};

/**
 * A name identifier [SAML-CORE 2.2.2]. Two are the same person only if all members are equal: the
 * same value in another format or under another qualifier is somebody else.
 */
struct AssertionNameId
{
    std::string value;
    boost::optional<std::string> format;
    boost::optional<std::string> nameQualifier;
    boost::optional<std::string> spNameQualifier;
    boost::optional<std::string> spProvidedId;
};

SSOCLIENT_API bool operator==(const AssertionNameId& a, const AssertionNameId& b);
inline bool operator!=(const AssertionNameId& a, const AssertionNameId& b)
{
    return !(a == b);
}

/** An X.509 certificate named by its issuer and serial number [XMLDSIG 4.4.4]. */
struct CertificateReference
{
    std::string issuerName;
    std::string serialNumber; ///< decimal digits
};

/** A `ds:KeyInfo`: one key, described in one or several ways. */
struct AssertionKey
{
    /** In document order; which of them holds the key is `certificate`. */
    std::vector<Quillon::Ref<const Quillon::Crypto::Certificate>> certificates;
    /** The one of `certificates` that holds the key; null if the key is not given by any. */
    Quillon::Ref<const Quillon::Crypto::Certificate> certificate;
    /** The key, from the certificate or from a key value; null if it is only named. */
    boost::shared_ptr<const Quillon::Crypto::PublicKey> publicKey;
    boost::optional<CertificateReference> issuerSerial;
    boost::optional<std::string> subjectName;
    boost::optional<std::string> keyName;
};

/** One way for the presenter to show that it may use the assertion [SAML-CORE 2.4.1.1]. */
struct AssertionConfirmation
{
    std::string method;
    boost::optional<AssertionNameId> nameId; ///< who is expected to present it, if not the subject
    boost::optional<Quillon::System::DateTime> notBefore;
    boost::optional<Quillon::System::DateTime> notOnOrAfter;
    boost::optional<std::string> recipient;
    boost::optional<std::string> inResponseTo;
    boost::optional<std::string> address;
    std::vector<AssertionKey> keys; ///< of holder-of-key: any of them confirms
};

/** One audience restriction: the assertion is for each of these [SAML-CORE 2.5.1.4]. */
using AssertionAudience = std::set<std::string>;

/** What those may do who issue assertions on the ground of this one [SAML-CORE 2.5.1.6]. */
struct AssertionProxyRestriction
{
    boost::optional<unsigned long long> count;
    AssertionAudience audience;
};

struct AssertionDelegate
{
    AssertionNameId nameId;
    boost::optional<Quillon::System::DateTime> delegationInstant;
    boost::optional<std::string> confirmationMethod;
};

struct AssertionRenewRestriction
{
    boost::optional<unsigned long long> count;
    bool postdatable = false;
    bool renewExpired = false;
};

/** All of these hold together [SAML-CORE 2.5.1]. */
struct AssertionConditions
{
    boost::optional<Quillon::System::DateTime> notBefore;
    boost::optional<Quillon::System::DateTime> notOnOrAfter;
    /** The one who uses the assertion must be named in **every** one: never join them. */
    std::vector<AssertionAudience> audienceRestrictions;
    bool oneTimeUse = false;
    boost::optional<AssertionProxyRestriction> proxyRestriction;
    /** Who has acted for the subject, the most recent last; empty without delegation. */
    std::vector<AssertionDelegate> delegates;
    boost::optional<AssertionRenewRestriction> renewRestriction;
};

/** An act of authentication [SAML-CORE 2.7.2]. */
struct AssertionAuthentication
{
    Quillon::System::DateTime authnInstant;
    boost::optional<std::string> sessionIndex;
    boost::optional<Quillon::System::DateTime> sessionNotOnOrAfter;
    boost::optional<std::string> localityAddress;
    boost::optional<std::string> localityDnsName;
    boost::optional<std::string> contextClass;
    boost::optional<std::string> contextDeclarationRef;
    boost::optional<AssertionXml> contextDeclaration;
    std::vector<std::string> authorities;
};

/** One value of an attribute. */
struct AssertionAttributeValue
{
    std::string text; ///< empty if the value holds elements
    /** The whole `AttributeValue` as canonical XML [EXC-C14N], if it holds elements. */
    boost::optional<std::string> xml;
    bool isNil = false;
    /** What `xsi:type` says, if the signature covers it. It decides nothing. */
    boost::optional<Quillon::Xml::QName> type;
    /** Every other attribute of the element. */
    std::vector<AssertionXmlAttribute> attributes;
};

struct AssertionAttribute
{
    std::string name;
    boost::optional<std::string> nameFormat;
    boost::optional<std::string> friendlyName;
    std::vector<AssertionXmlAttribute> otherAttributes; ///< of other namespaces
    std::vector<AssertionAttributeValue> values;
};

/** What the bearer method and the holder-of-key method are called [SAML-PROF 3.1, 3.3]. */
inline constexpr char BearerConfirmation[] = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
inline constexpr char HolderOfKeyConfirmation[] = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";

/** What an assertion must be like beyond being signed and valid. */
struct AssertionRules
{
    /** By how much times are widened at both ends, in seconds. */
    long long clockToleranceSec = 600;
    /** Every audience restriction must name it, and there must be one. */
    boost::optional<std::string> audience;
    /** The confirmation must say so. */
    boost::optional<std::string> recipient;
    boost::optional<std::string> inResponseTo;
    std::set<std::string> confirmationMethods = {BearerConfirmation, HolderOfKeyConfirmation};
    /** How long ago it may have been issued, in seconds, whatever end it gives itself. */
    boost::optional<long long> maximumAgeSec;
    /**
     * RSA keys that an encrypted assertion is decrypted with; each is tried, so that there may be
     * an old and a new one. Without any an encrypted assertion is refused.
     */
    std::vector<Quillon::Ref<const Quillon::Crypto::PrivateKey>> decryptionKeys;
};

/** Everything that an assertion says. */
struct AssertionFacts
{
    std::string id;
    Quillon::System::DateTime issueInstant;
    AssertionNameId issuer;
    boost::optional<AssertionNameId> subject; ///< absent if only the confirmation tells who it is
    std::vector<AssertionConfirmation> confirmations;
    AssertionConditions conditions;
    std::vector<AssertionXml> advice;
    std::vector<AssertionAuthentication> authentications;
    /** Of all attribute statements, in document order. */
    std::vector<AssertionAttribute> attributes;
};

/**
 * An assertion that was verified when the object was made. `VerifyAssertion` is the only way to
 * one.
 *
 * Thread safety: immutable; any number of threads.
 */
class SSOCLIENT_API VerifiedAssertion
{
public:
    const AssertionFacts& GetFacts() const noexcept { return _facts; }

    /** The one confirmation that the rules accept. */
    const AssertionConfirmation& GetConfirmation() const noexcept
    {
        return _facts.confirmations[_confirmation];
    }

    /** The latest of the starts that conditions and confirmation give; else the issue instant. */
    const Quillon::System::DateTime& GetStartDate() const noexcept { return _startDate; }

    /** The earliest of the ends that conditions, confirmation and sessions give. */
    const Quillon::System::DateTime& GetEndDate() const noexcept { return _endDate; }

    /** Whether every audience restriction names `audience`; true if there is none. */
    bool IsFor(const std::string& audience) const;

    /** The first attribute of that name; null if there is none. */
    const AssertionAttribute* FindAttribute(const std::string& name) const noexcept;

    /**
     * The text as it was given or, of an encrypted one, as it was decrypted. A bearer assertion is
     * a credential: guard it.
     */
    const std::string& ToXml() const noexcept { return _xml; }

private:
    friend class AssertionVerifier;
    VerifiedAssertion() = default;

    AssertionFacts _facts;
    std::size_t _confirmation = 0;
    Quillon::System::DateTime _startDate;
    Quillon::System::DateTime _endDate;
    std::string _xml;
};

/**
 * Verifies a SAML 2.0 assertion, then reads it, then judges it by the rules.
 *
 * An `EncryptedAssertion` [SAML-CORE 2.3.4], or the `xenc:EncryptedData` that token services send
 * in its place, is decrypted before, and what was in it must be one signed assertion. Accepted:
 * AES-128, AES-192 and AES-256 in GCM, their keys by RSA-OAEP with SHA-1, SHA-256, SHA-384 or
 * SHA-512. Not accepted: CBC and PKCS #1 v1.5, which betray the text to who sees how decrypting
 * fails.
 *
 * Refused whatever the rules: a condition that is not known [SAML-CORE 2.5.1]; anything encrypted
 * in the assertion; an assertion without an end of validity; one whose subject has no confirmation
 * that the rules accept, or several (then the rules must say which); an `xsi:type` that decides
 * something while the signature does not cover what its prefix is bound to; a comment or processing
 * instruction that cuts a value in two. What only the caller can judge is told: name identifier
 * formats and qualifiers, one-time use, delegation, proxy restrictions, addresses.
 *
 * @param xml                  the assertion alone, encrypted or not, UTF-8.
 * @param trustedCertificates  the certificates whose keys may have signed, byte for byte. Their
 *                             own validity dates are not looked at. Each may sign for any issuer.
 *
 * @throws InvalidSignatureException           the signature does not verify.
 * @throws ParseException                      a deviation from SAML 2.0, something that is refused,
 *                                             or a rule that is not met. The text names the
 *                                             element with its line and column, the value found and
 *                                             the value expected.
 * @throws Quillon::Xml::XMLParseException     `xml` is not well-formed or exceeds a limit.
 * @throws Quillon::Crypto::CryptoException    OpenSSL does not offer what the text is encrypted by.
 * @throws Quillon::InvalidArgumentException   a trusted certificate or a decryption key is null, or
 *                                             such a key is not RSA.
 *
 * Thread safety: any number of threads. Cost: one parse, one hash and one public-key operation; of
 * an encrypted one twice the parsing, and a private-key operation for each key that is tried.
 */
SSOCLIENT_API boost::shared_ptr<const VerifiedAssertion> VerifyAssertion(
    const std::string& xml,
    const std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>& trustedCertificates,
    const AssertionRules& rules = AssertionRules());

} // namespace SsoClient
