#include "ssoClient/assertion/assertionReading.h"

#include "ssoClient/Exceptions.h"
#include "ssoClient/assertion/conditionsReading.h"
#include "ssoClient/assertion/statementsReading.h"
#include "ssoClient/assertion/subjectReading.h"
#include "ssoClient/wire/wireNames.h"

#include <algorithm>

namespace SsoClient::GeneralReader {

namespace Security = Quillon::Xml::Security;

namespace {

bool IsNameStart(unsigned char letter) noexcept
{
    return (letter >= 'A' && letter <= 'Z') || (letter >= 'a' && letter <= 'z') || letter == '_'
           || letter >= 0x80;
}

/** [XML Names 3]; beyond ASCII every character is taken for one of a name. */
bool IsNcName(std::string_view text) noexcept
{
    return !text.empty() && IsNameStart(static_cast<unsigned char>(text.front()))
           && std::all_of(text.begin(), text.end(), [](unsigned char letter) {
                  return IsNameStart(letter) || (letter >= '0' && letter <= '9') || letter == '-'
                         || letter == '.';
              });
}

void ReadIdentification(
    const ReaderContext& context, const ElementNode& element, AssertionFacts& facts)
{
    CheckAttributes(context, element, {"Version", "ID", "IssueInstant"}, SamlType("AssertionType"));
    const std::string version = GetRequired(element, "Version");
    if (version != "2.0") {
        throw ParseException(
            "The version of " + Describe(element) + " is " + Quote(version) + ", expected '2.0'");
    }
    facts.id = GetRequired(element, "ID");
    if (!IsNcName(facts.id)) {
        throw ParseException(
            "ID " + Quote(facts.id) + " of " + Describe(element) + " is no NCName");
    }
    facts.issueInstant = GetRequiredDate(element, "IssueInstant");
}

std::vector<AssertionXml> ReadAdvice(const ReaderContext& context, const ElementNode& element)
{
    CheckAttributes(context, element, {}, SamlType("AdviceType"));
    std::vector<AssertionXml> advice;
    for (ElementCursor child(element); child.Get() != nullptr;) {
        advice.push_back(ReadXml(child.TakeAny()));
    }
    return advice;
}

/** [SAML-CORE 2.3.3]: in any order, as many as there are. */
void ReadStatements(const ReaderContext& context, ElementCursor& child, AssertionFacts& facts)
{
    while (child.Get() != nullptr) {
        if (const ElementNode* authn = child.TakeIf("AuthnStatement")) {
            facts.authentications.push_back(ReadAuthnStatement(context, *authn));
        } else {
            ReadAttributeStatement(context, child.Take("AttributeStatement"), facts.attributes);
        }
    }
}

} // namespace

Quillon::Ref<Security::Signature> FindSignature(ElementNode& assertion)
{
    ElementNode* element = assertion.FindChildElement("Signature", Wire::DsNamespace);
    if (element == nullptr) {
        throw ParseException(Describe(assertion) + " is not signed");
    }
    Quillon::Ref<Security::Signature> signature;
    try {
        Security::CreateSignatureFromDom(
            &assertion, element, Security::SignatureProfile::WITH_RSA_PSS, signature);
    } catch (const Security::SignatureSyntaxException& error) {
        throw ParseException(std::string("Signature syntax error: ") + error.what());
    }
    return signature;
}

AssertionFacts ReadAssertion(const ElementNode& assertion, const Security::Signature& signature)
{
    const ReaderContext context{&signature};
    AssertionFacts facts;
    ReadIdentification(context, assertion, facts);
    ElementCursor child(assertion);
    facts.issuer = ReadNameId(context, child.Take("Issuer"));
    // The signature that was verified; a second one would be none of SAML's and is met below.
    if (child.Get() != signature.GetElement()) {
        throw ParseException("The signature of " + Describe(assertion) + " must follow the issuer");
    }
    child.TakeAny();
    if (const ElementNode* subject = child.TakeIf("Subject")) {
        ReadSubject(context, *subject, facts);
    }
    if (const ElementNode* conditions = child.TakeIf("Conditions")) {
        facts.conditions = ReadConditions(context, *conditions);
    }
    if (const ElementNode* advice = child.TakeIf("Advice")) {
        facts.advice = ReadAdvice(context, *advice);
    }
    ReadStatements(context, child, facts);
    return facts;
}

} // namespace SsoClient::GeneralReader
