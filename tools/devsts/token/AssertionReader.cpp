#include "devsts/token/AssertionReader.h"

#include "devsts/security/SignatureReader.h"
#include "devsts/security/Verifying.h"
#include "devsts/security/XmlSec.h"
#include "devsts/wire/Base64.h"
#include "devsts/wire/Names.h"

#include <charconv>

namespace DevSts {

namespace {

TimePoint TimeAttribute(const xmlNode* element, const char* name)
{
    const std::string text = RequireAttribute(element, {"", name});
    const std::optional<TimePoint> time = ParseTime(text);
    if (!time) {
        throw ShapeError("'" + text + "' is not a UTC time");
    }
    return *time;
}

unsigned CountAttribute(const xmlNode* element)
{
    const std::string text = RequireAttribute(element, {"", "Count"});
    unsigned count = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
    if (error != std::errc() || end != text.data() + text.size()) {
        throw ShapeError("'" + text + "' is not a count");
    }
    return count;
}

void RequireSignature(
    xmlNode* assertion,
    xmlNode* signature,
    const std::string& id,
    const std::string& certificateDer)
{
    const SignatureParts parts = ReadSignature(signature, SignatureKind::ASSERTION);
    if (parts.references.size() != 1 || parts.references.front().uri != "#" + id) {
        throw ShapeError("The signature of the token must cover the token and nothing else");
    }
    RegisterId(assertion, {"", "ID"});
    if (!VerifySignature(signature, certificateDer)) {
        throw ShapeError("The signature of the token does not verify");
    }
}

std::string ReadKeyInfo(const xmlNode* data)
{
    ChildCursor children(data);
    ChildCursor keyInfo(children.Take({Names::Ds, "KeyInfo"}));
    ChildCursor x509(keyInfo.Take({Names::Ds, "X509Data"}));
    return DecodeBase64(TextOf(x509.Take({Names::Ds, "X509Certificate"})));
}

void ReadSubject(const xmlNode* element, Assertion& assertion)
{
    ChildCursor children(element);
    assertion.subject = TextOf(children.Take({Names::Saml, "NameID"}));
    const xmlNode* confirmation = children.Take({Names::Saml, "SubjectConfirmation"});
    ChildCursor parts(confirmation);
    // The delegate's name stands in the restriction as well.
    parts.TryTake({Names::Saml, "NameID"});
    const xmlNode* data = parts.Take({Names::Saml, "SubjectConfirmationData"});
    if (RequireAttribute(confirmation, {"", "Method"}) == Names::MethodHolderOfKey) {
        assertion.confirmationCertificateDer = ReadKeyInfo(data);
    }
}

void ReadDelegates(const xmlNode* element, Assertion& assertion)
{
    ChildCursor children(element);
    while (!children.AtEnd()) {
        const xmlNode* delegate = children.Take({Names::Del, "Delegate"});
        ChildCursor parts(delegate);
        assertion.delegates.push_back(
            {TextOf(parts.Take({Names::Saml, "NameID"})),
             TimeAttribute(delegate, "DelegationInstant")});
    }
}

void ReadCondition(const xmlNode* element, Assertion& assertion)
{
    if (RequireAttribute(element, {Names::Xsi, "type"}) == "rsa:RenewRestrictionType") {
        assertion.renewCount = CountAttribute(element);
    } else {
        ReadDelegates(element, assertion);
    }
}

void ReadAudience(const xmlNode* element, Assertion& assertion)
{
    ChildCursor children(element);
    while (!children.AtEnd()) {
        assertion.audience.insert(TextOf(children.Take({Names::Saml, "Audience"})));
    }
}

void ReadConditions(const xmlNode* element, Assertion& assertion)
{
    assertion.notBefore = TimeAttribute(element, "NotBefore");
    assertion.notOnOrAfter = TimeAttribute(element, "NotOnOrAfter");
    ChildCursor children(element);
    while (!children.AtEnd()) {
        if (const xmlNode* proxy = children.TryTake({Names::Saml, "ProxyRestriction"})) {
            assertion.proxyCount = CountAttribute(proxy);
        } else if (
            const xmlNode* audience = children.TryTake({Names::Saml, "AudienceRestriction"})) {
            ReadAudience(audience, assertion);
        } else {
            ReadCondition(children.Take({Names::Saml, "Condition"}), assertion);
        }
    }
}

AdviceAttribute ReadAdviceAttribute(const xmlNode* element)
{
    AdviceAttribute attribute;
    attribute.name = RequireAttribute(element, {"", "Name"});
    ChildCursor children(element);
    while (!children.AtEnd()) {
        attribute.values.push_back(TextOf(children.Take({Names::Saml, "AttributeValue"})));
    }
    return attribute;
}

void ReadAdvice(const xmlNode* element, Assertion& assertion)
{
    ChildCursor children(element);
    while (!children.AtEnd()) {
        const xmlNode* rsaAdvice = children.Take({Names::Rsa, "RSAAdvice"});
        Advice advice;
        advice.source = RequireAttribute(rsaAdvice, {"", "AdviceSource"});
        ChildCursor attributes(rsaAdvice);
        while (!attributes.AtEnd()) {
            advice.attributes.push_back(
                ReadAdviceAttribute(attributes.Take({Names::Saml, "Attribute"})));
        }
        assertion.advice.push_back(std::move(advice));
    }
}

void ReadAuthnStatement(const xmlNode* element, Assertion& assertion)
{
    assertion.authnInstant = TimeAttribute(element, "AuthnInstant");
    ChildCursor children(element);
    ChildCursor context(children.Take({Names::Saml, "AuthnContext"}));
    assertion.authnContext = TextOf(context.Take({Names::Saml, "AuthnContextClassRef"}));
}

} // namespace

Assertion ReadVerifiedAssertion(xmlNode* element, const std::string& signingCertificateDer)
{
    Assertion assertion;
    assertion.id = RequireAttribute(element, {"", "ID"});
    ChildCursor children(element);
    children.Take({Names::Saml, "Issuer"});
    RequireSignature(
        element, children.Take({Names::Ds, "Signature"}), assertion.id, signingCertificateDer);
    assertion.issueInstant = TimeAttribute(element, "IssueInstant");
    ReadSubject(children.Take({Names::Saml, "Subject"}), assertion);
    ReadConditions(children.Take({Names::Saml, "Conditions"}), assertion);
    if (const xmlNode* advice = children.TryTake({Names::Saml, "Advice"})) {
        ReadAdvice(advice, assertion);
    }
    ReadAuthnStatement(children.Take({Names::Saml, "AuthnStatement"}), assertion);
    return assertion;
}

void RequireCurrent(const Assertion& assertion, TimePoint now)
{
    // Tokens begin by the clock of whoever asked for them, and end by this one.
    if (assertion.notBefore > now + ClockSkew) {
        throw ShapeError("The token is valid from " + FormatTime(assertion.notBefore) + " only");
    }
    if (assertion.notOnOrAfter <= now) {
        throw ShapeError("The token has expired at " + FormatTime(assertion.notOnOrAfter));
    }
}

} // namespace DevSts
