#include "devsts/wire/RequestReader.h"

#include "devsts/wire/Fault.h"
#include "devsts/wire/Names.h"
#include "devsts/wire/NegotiationReader.h"

#include <array>

namespace DevSts {

namespace {

struct OperationNames
{
    Operation operation;
    const char* action;
    const char* requestType;
    const char* tokenType;
};

constexpr std::array<OperationNames, 4> Operations{{
    {Operation::ISSUE, Names::ActionIssue, Names::RequestIssue, Names::Saml},
    {Operation::RENEW, Names::ActionRenew, Names::RequestRenew, Names::Saml},
    {Operation::VALIDATE, Names::ActionValidate, Names::RequestValidate, Names::TokenStatus},
    {Operation::CONTINUE, Names::ActionContinue, "", ""},
}};

const OperationNames& ReadAction(const std::optional<std::string>& soapAction)
{
    if (!soapAction) {
        throw Fault(FaultCodes::Client, "The SOAPAction header is missing");
    }
    for (const OperationNames& names : Operations) {
        if (*soapAction == '"' + std::string(names.action) + '"') {
            return names;
        }
    }
    throw Fault(
        FaultCodes::Client,
        "The SOAPAction header must be the quoted Issue, Renew or Validate action or that of an "
        "Issue response, not "
            + *soapAction);
}

void RequireText(const xmlNode* element, const char* expected)
{
    AllowAttributes(element, {});
    const std::string found = TextOf(element);
    if (found != expected) {
        throw ShapeError(
            "Element '" + std::string(reinterpret_cast<const char*>(element->name)) + "' must be '"
            + expected + "', not '" + found + "'");
    }
}

void RequireEmpty(const xmlNode* element)
{
    ChildCursor(element).RequireEnd();
}

std::string PlainText(const xmlNode* element)
{
    AllowAttributes(element, {});
    return TextOf(element);
}

bool ReadBool(const std::string& name, const std::string& text)
{
    if (text != "true" && text != "false") {
        throw ShapeError("'" + name + "' must be 'true' or 'false', not '" + text + "'");
    }
    return text == "true";
}

TimePoint ReadTime(const xmlNode* element)
{
    const std::string text = PlainText(element);
    const std::optional<TimePoint> time = ParseTime(text);
    if (!time) {
        throw ShapeError("'" + text + "' is not a UTC time");
    }
    return *time;
}

Interval ReadInterval(const xmlNode* element)
{
    ChildCursor children(element);
    Interval interval;
    interval.created = ReadTime(children.Take({Names::Wsu, "Created"}));
    interval.expires = ReadTime(children.Take({Names::Wsu, "Expires"}));
    children.RequireEnd();
    return interval;
}

void ReadEnvelope(Request& request, xmlNode*& security)
{
    const xmlNode* envelope = xmlDocGetRootElement(request.doc.get());
    if (!IsElement(envelope, {Names::Soap, "Envelope"})) {
        throw ShapeError("The root element must be a SOAP 1.1 Envelope");
    }
    AllowAttributes(envelope, {});
    ChildCursor children(envelope);
    const xmlNode* header = children.Take({Names::Soap, "Header"});
    request.body = children.Take({Names::Soap, "Body"});
    children.RequireEnd();

    AllowAttributes(header, {});
    ChildCursor headers(header);
    security = headers.Take({Names::Wsse, "Security"});
    headers.RequireEnd();
    AllowAttributes(request.body, {{Names::Wsu, "Id"}});
}

UsernameToken ReadUsernameToken(const xmlNode* element)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    UsernameToken token;
    token.name = PlainText(children.Take({Names::Wsse, "Username"}));
    const xmlNode* password = children.Take({Names::Wsse, "Password"});
    children.RequireEnd();
    AllowAttributes(password, {{"", "Type"}});
    if (RequireAttribute(password, {"", "Type"}) != Names::PasswordText) {
        throw ShapeError("The Type of the Password must be PasswordText");
    }
    token.password = TextOf(password);
    return token;
}

void ReadSecurity(Request& request, const xmlNode* security)
{
    AllowAttributes(security, {});
    ChildCursor children(security);
    request.timestamp = children.Take({Names::Wsu, "Timestamp"});
    AllowAttributes(request.timestamp, {{Names::Wsu, "Id"}});
    request.freshness = ReadInterval(request.timestamp);
    if (const xmlNode* token = children.TryTake({Names::Wsse, "UsernameToken"})) {
        request.usernameToken = ReadUsernameToken(token);
    }
    request.presentedAssertion = children.TryTake({Names::Saml, "Assertion"});
    request.binaryToken = children.TryTake({Names::Wsse, "BinarySecurityToken"});
    request.signature = children.TryTake({Names::Ds, "Signature"});
    children.RequireEnd();
}

KeyType ReadKeyType(const xmlNode* element)
{
    const std::string text = PlainText(element);
    if (text == Names::KeyBearer) {
        return KeyType::BEARER;
    }
    if (text == Names::KeyPublic) {
        return KeyType::PUBLIC_KEY;
    }
    throw ShapeError(
        "The KeyType must be the Bearer or the PublicKey identifier, not '" + text + "'");
}

Interval ReadLifetime(const xmlNode* element)
{
    AllowAttributes(element, {});
    return ReadInterval(element);
}

bool ReadRenewing(const xmlNode* element)
{
    AllowAttributes(element, {{"", "Allow"}, {"", "OK"}});
    RequireEmpty(element);
    if (ReadBool("OK", RequireAttribute(element, {"", "OK"}))) {
        throw ShapeError("Renewing tokens that have expired is not offered; OK must be 'false'");
    }
    return ReadBool("Allow", RequireAttribute(element, {"", "Allow"}));
}

std::string ReadDelegateTo(const xmlNode* element)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    const xmlNode* token = children.Take({Names::Wsse, "UsernameToken"});
    children.RequireEnd();
    AllowAttributes(token, {});
    ChildCursor parts(token);
    std::string name = PlainText(parts.Take({Names::Wsse, "Username"}));
    parts.RequireEnd();
    return name;
}

std::string ReadParticipant(const xmlNode* element)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    const xmlNode* reference = children.Take({Names::Wsa, "EndpointReference"});
    children.RequireEnd();
    AllowAttributes(reference, {});
    ChildCursor parts(reference);
    std::string address = PlainText(parts.Take({Names::Wsa, "Address"}));
    parts.RequireEnd();
    return address;
}

std::vector<std::string> ReadParticipants(const xmlNode* element)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    std::vector<std::string> participants;
    do {
        participants.push_back(ReadParticipant(children.Take({Names::Wst, "Participant"})));
    } while (!children.AtEnd());
    return participants;
}

std::string ReadAdviceValue(const xmlNode* element)
{
    AllowAttributes(element, {{Names::Xsi, "type"}});
    const std::string type = RequireAttribute(element, {Names::Xsi, "type"});
    if (type != "xs:string") {
        throw ShapeError(
            "The xsi:type of an AttributeValue must be 'xs:string', not '" + type + "'");
    }
    return TextOf(element);
}

AdviceAttribute ReadAdviceAttribute(const xmlNode* element)
{
    AllowAttributes(element, {{"", "Name"}});
    AdviceAttribute attribute;
    attribute.name = RequireAttribute(element, {"", "Name"});
    ChildCursor children(element);
    while (!children.AtEnd()) {
        attribute.values.push_back(
            ReadAdviceValue(children.Take({Names::RsaAdvice, "AttributeValue"})));
    }
    return attribute;
}

Advice ReadAdvice(const xmlNode* element)
{
    AllowAttributes(element, {{"", "AdviceSource"}});
    Advice advice;
    advice.source = RequireAttribute(element, {"", "AdviceSource"});
    ChildCursor children(element);
    do {
        advice.attributes.push_back(
            ReadAdviceAttribute(children.Take({Names::RsaAdvice, "Attribute"})));
    } while (!children.AtEnd());
    return advice;
}

std::vector<Advice> ReadAdviceSet(const xmlNode* element)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    std::vector<Advice> advice;
    do {
        advice.push_back(ReadAdvice(children.Take({Names::RsaAdvice, "Advice"})));
    } while (!children.AtEnd());
    return advice;
}

std::string ReadUseKey(const xmlNode* element)
{
    AllowAttributes(element, {{"", "Sig"}});
    RequireEmpty(element);
    return RequireAttribute(element, {"", "Sig"});
}

void ReadIssueRequest(ChildCursor& children, TokenRequest& token)
{
    token.keyType = ReadKeyType(children.Take({Names::Wst, "KeyType"}));
    token.lifetime = ReadLifetime(children.Take({Names::Wst, "Lifetime"}));
    token.renewable = ReadRenewing(children.Take({Names::Wst, "Renewing"}));
    token.delegable =
        ReadBool("Delegatable", PlainText(children.Take({Names::Wst, "Delegatable"})));
    if (const xmlNode* element = children.TryTake({Names::Wst, "DelegateTo"})) {
        token.delegateTo = ReadDelegateTo(element);
    }
    if (const xmlNode* element = children.TryTake({Names::Wst, "Participants"})) {
        token.audience = ReadParticipants(element);
    }
    if (const xmlNode* element = children.TryTake({Names::RsaAdvice, "AdviceSet"})) {
        token.advice = ReadAdviceSet(element);
    }
    if (const xmlNode* element = children.TryTake({Names::Wst, "UseKey"})) {
        token.useKeySig = ReadUseKey(element);
    }
}

xmlNode* ReadTarget(const xmlNode* element)
{
    AllowAttributes(element, {});
    ChildCursor children(element);
    xmlNode* assertion = children.Take({Names::Saml, "Assertion"});
    children.RequireEnd();
    return assertion;
}

const xmlNode* OnlyChild(const xmlNode* parent, const XmlName& name)
{
    ChildCursor children(parent);
    const xmlNode* child = children.Take(name);
    children.RequireEnd();
    return child;
}

void ReadBody(Request& request, const OperationNames& names)
{
    if (names.operation == Operation::CONTINUE) {
        request.leg = ReadContinuedRequest(
            OnlyChild(request.body, {Names::Wst, "RequestSecurityTokenResponse"}));
        return;
    }
    const xmlNode* element = OnlyChild(request.body, {Names::Wst, "RequestSecurityToken"});
    ChildCursor children(element);
    RequireText(children.Take({Names::Wst, "TokenType"}), names.tokenType);
    RequireText(children.Take({Names::Wst, "RequestType"}), names.requestType);
    switch (names.operation) {
    case Operation::ISSUE:
        ReadIssueRequest(children, request.token);
        if (const xmlNode* exchange = children.TryTake({Names::Wst, "BinaryExchange"})) {
            request.leg = ReadNegotiationLeg(element, exchange);
        }
        break;
    case Operation::RENEW:
        request.token.lifetime = ReadLifetime(children.Take({Names::Wst, "Lifetime"}));
        request.token.target = ReadTarget(children.Take({Names::Wst, "RenewTarget"}));
        break;
    case Operation::VALIDATE:
        request.token.target = ReadTarget(children.Take({Names::Wst, "ValidateTarget"}));
        break;
    case Operation::CONTINUE:
        break;
    }
    children.RequireEnd();
    if (!request.leg) {
        AllowAttributes(element, {});
    }
}

} // namespace

Request ReadRequest(const std::string& envelope, const std::optional<std::string>& soapAction)
{
    const OperationNames& names = ReadAction(soapAction);
    Request request;
    request.operation = names.operation;
    xmlNode* security = nullptr;
    try {
        request.doc = ParseXml(envelope);
        ReadEnvelope(request, security);
    } catch (const ShapeError& error) {
        throw Fault(FaultCodes::Client, error.what());
    }
    try {
        ReadSecurity(request, security);
        ReadBody(request, names);
    } catch (const ShapeError& error) {
        throw Fault(FaultCodes::InvalidRequest, error.what());
    }
    return request;
}

} // namespace DevSts
