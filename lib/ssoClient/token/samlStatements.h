#pragma once

#include "quillon/system/DateTime.h"
#include "ssoClient/Advice.h"
#include "ssoClient/wire/xmlReading.h"

#include <boost/optional.hpp>

#include <string>
#include <vector>

/**
 * The advice and the statements of an assertion [SAML-CORE 2.6, 2.7], in the narrow shape that the
 * token service issues. Members are named after the elements and attributes they hold.
 *
 * Each parser takes the iterator on its element and leaves it on the next sibling.
 */
namespace SsoClient {

// NOLINTBEGIN(readability-identifier-naming): the schema's names
struct AttributeType
{
    std::string Name;
    std::string NameFormat;
    std::string FriendlyName;
    std::vector<std::string> AttributeValue;
};

struct AttributeStatementType
{
    std::vector<AttributeType> Attribute;
};

struct AuthnContextType
{
    std::string AuthnContextClassRef;
};

struct AuthnStatementType
{
    Quillon::System::DateTime AuthnInstant;
    AuthnContextType AuthnContext;
};

struct AdviceType
{
    std::vector<Advice> RSAAdvice;
};
// NOLINTEND(readability-identifier-naming)

/** Leaves another element alone and the advice unset. */
void TryParseAdviceElement(NodeFilterIterator& iterator, boost::optional<AdviceType>& advice);
void ParseRsaAdviceElement(NodeFilterIterator& iterator, Advice& advice);
void ParseAuthnStatementElement(NodeFilterIterator& iterator, AuthnStatementType& statement);
void ParseAuthnContextElement(NodeFilterIterator& iterator, AuthnContextType& context);
void ParseAttributeStatementElement(
    NodeFilterIterator& iterator, AttributeStatementType& statement);
void ParseAttributeElement(NodeFilterIterator& iterator, AttributeType& attribute);

} // namespace SsoClient
