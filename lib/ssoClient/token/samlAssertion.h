#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/system/DateTime.h"
#include "quillon/xml/security/Signature.h"
#include "ssoClient/SamlToken.h"
#include "ssoClient/token/samlStatements.h"
#include "ssoClient/wire/xmlReading.h"

#include <boost/optional.hpp>

#include <set>
#include <string>
#include <vector>

/**
 * A SAML 2.0 assertion as a typed model, and its reading in the narrow shape that the token
 * service issues: fixed order of children, exact attribute sets, an enveloped signature, only the
 * conditions that are understood. Anything else is a `ParseException`.
 *
 * Nothing here verifies the signature or judges times: the model says what is written. Members are
 * named after the elements and attributes they hold.
 */
namespace SsoClient {

// NOLINTBEGIN(readability-identifier-naming): the schema's names
struct NameIDType
{
    std::string Format;
    std::string Value;
};

struct SubjectConfirmationDataType
{
    Quillon::System::DateTime NotOnOrAfter;                       ///< of a bearer confirmation
    Quillon::Ref<const Quillon::Crypto::Certificate> Certificate; ///< of holder-of-key
};

struct SubjectConfirmationType
{
    SamlToken::ConfirmationType Method = SamlToken::CONFIRM_BEARER;
    boost::optional<NameIDType> NameID; ///< the delegate
    SubjectConfirmationDataType SubjectConfirmationData;
};

struct SubjectType
{
    NameIDType NameID;
    SubjectConfirmationType SubjectConfirmation;
};

struct RenewRestrictionType
{
    boost::optional<unsigned long long> Count;
};

struct DelegateType
{
    Quillon::System::DateTime DelegationInstant;
    NameIDType NameID;
};

struct DelegationRestrictionType
{
    std::vector<DelegateType> Delegate; ///< the most recent last
};

struct AudienceRestrictionType
{
    std::set<std::string> Audience;
};

struct ProxyRestrictionType
{
    boost::optional<unsigned long long> Count;
};

struct ConditionsType
{
    Quillon::System::DateTime NotBefore;
    Quillon::System::DateTime NotOnOrAfter;
    boost::optional<RenewRestrictionType> RenewRestriction;
    boost::optional<DelegationRestrictionType> DelegationRestriction;
    boost::optional<AudienceRestrictionType> AudienceRestriction;
    boost::optional<ProxyRestrictionType> ProxyRestriction;
};

struct SamlAssertionType
{
    std::string Version;
    std::string ID;
    Quillon::System::DateTime IssueInstant;
    NameIDType Issuer;
    Quillon::Ref<Quillon::Xml::Security::Signature> Signature;
    SubjectType Subject;
    ConditionsType Conditions;
    boost::optional<AdviceType> Advice;
    AuthnStatementType AuthnStatement;
    boost::optional<AttributeStatementType> AttributeStatement;
};
// NOLINTEND(readability-identifier-naming)

// Each parser takes the iterator on its element and leaves it on the next sibling. The
// `TryParse...` ones leave another element alone and the optional unset.

void ParseSamlAssertionElement(NodeFilterIterator& iterator, SamlAssertionType& assertion);
void ParseSamlIssuerElement(NodeFilterIterator& iterator, NameIDType& issuer);

/** Demands a signature with a reference to the whole assertion; does not verify it. */
void ParseTokenSignature(
    NodeFilterIterator& iterator,
    Quillon::Xml::ElementNode* assertion,
    Quillon::Ref<Quillon::Xml::Security::Signature>& signature);

void ParseSubjectElement(NodeFilterIterator& iterator, SubjectType& subject);
void ParseSubjectNameIdElement(NodeFilterIterator& iterator, NameIDType& nameId);
void ParseSubjectConfirmationElement(
    NodeFilterIterator& iterator, SubjectConfirmationType& confirmation);

/** Reads the data that goes with `confirmation.Method`. */
void ParseSubjectConfirmationDataElement(
    NodeFilterIterator& iterator, SubjectConfirmationType& confirmation);
void ParseSubjectConfirmationDataKeyInfoElement(
    NodeFilterIterator& iterator, SubjectConfirmationDataType& data);

/** What all elements of that type have in common; does not move and does not check the name. */
void ParseNameIDType(const NodeFilterIterator& iterator, NameIDType& nameId);

void ParseConditionsElement(NodeFilterIterator& iterator, ConditionsType& conditions);
void TryParseAudienceRestriction(
    NodeFilterIterator& iterator, boost::optional<AudienceRestrictionType>& restriction);
void TryParseDelegationRestriction(
    NodeFilterIterator& iterator, boost::optional<DelegationRestrictionType>& restriction);
void ParseDelegate(NodeFilterIterator& iterator, DelegateType& delegate);
void TryParseProxyRestriction(
    NodeFilterIterator& iterator, boost::optional<ProxyRestrictionType>& restriction);
void TryParseRenewRestriction(
    NodeFilterIterator& iterator, boost::optional<RenewRestrictionType>& restriction);

} // namespace SsoClient
