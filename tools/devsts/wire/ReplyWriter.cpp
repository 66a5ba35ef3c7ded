#include "devsts/wire/ReplyWriter.h"

#include "devsts/wire/Base64.h"
#include "devsts/wire/Names.h"

#include <new>

namespace DevSts {

namespace {

struct Envelope
{
    XmlDocument doc = NewDocument("soapenv", {Names::Soap, "Envelope"});
    xmlNode* body = nullptr;
    xmlNs* wst = nullptr;

    Envelope()
    {
        xmlNode* envelope = xmlDocGetRootElement(doc.get());
        body = AddElement(envelope, envelope->ns, "Body");
        wst = DeclareNamespace(body, "wst", Names::Wst);
    }
};

xmlNode* AddResponse(xmlNode* parent, xmlNs* wst, const xmlDoc* assertion, const Interval& lifetime)
{
    xmlNode* response = AddElement(parent, wst, "RequestSecurityTokenResponse");
    AddElement(response, wst, "TokenType", Names::Saml);
    xmlNode* token = AddElement(response, wst, "RequestedSecurityToken");
    // The copy keeps its namespace declarations and its text node for node, and so its signature.
    xmlNode* copy = xmlDocCopyNode(xmlDocGetRootElement(assertion), parent->doc, 1);
    if (copy == nullptr) {
        throw std::bad_alloc();
    }
    xmlAddChild(token, copy);
    xmlNode* element = AddElement(response, wst, "Lifetime");
    xmlNs* wsu = DeclareNamespace(element, "wsu", Names::Wsu);
    AddElement(element, wsu, "Created", FormatTime(lifetime.created));
    AddElement(element, wsu, "Expires", FormatTime(lifetime.expires));
    return response;
}

void AddBinaryExchange(xmlNode* response, xmlNs* wst, const std::string& bytes)
{
    xmlNode* exchange = AddElement(response, wst, "BinaryExchange", EncodeBase64(bytes));
    SetAttribute(exchange, "ValueType", Names::Spnego);
    SetAttribute(exchange, "EncodingType", Names::Base64Binary);
}

} // namespace

std::string WriteIssueReply(const xmlDoc* assertion, const Interval& lifetime)
{
    const Envelope reply;
    xmlNode* collection =
        AddElement(reply.body, reply.wst, "RequestSecurityTokenResponseCollection");
    AddResponse(collection, reply.wst, assertion, lifetime);
    return Serialize(reply.doc.get());
}

std::string WriteLegReply(const NegotiationLeg& leg)
{
    const Envelope reply;
    xmlNode* response = AddElement(reply.body, reply.wst, "RequestSecurityTokenResponse");
    SetAttribute(response, "Context", leg.context);
    AddBinaryExchange(response, reply.wst, leg.bytes);
    return Serialize(reply.doc.get());
}

std::string WriteNegotiatedReply(
    const xmlDoc* assertion, const Interval& lifetime, const NegotiationLeg& leg)
{
    const Envelope reply;
    xmlNode* collection =
        AddElement(reply.body, reply.wst, "RequestSecurityTokenResponseCollection");
    xmlNode* response = AddResponse(collection, reply.wst, assertion, lifetime);
    SetAttribute(response, "Context", leg.context);
    if (!leg.bytes.empty()) {
        AddBinaryExchange(response, reply.wst, leg.bytes);
    }
    return Serialize(reply.doc.get());
}

std::string WriteRenewReply(const xmlDoc* assertion, const Interval& lifetime)
{
    const Envelope reply;
    AddResponse(reply.body, reply.wst, assertion, lifetime);
    return Serialize(reply.doc.get());
}

std::string WriteStatusReply(bool isValid, const std::string& reason)
{
    const Envelope reply;
    xmlNode* response = AddElement(reply.body, reply.wst, "RequestSecurityTokenResponse");
    AddElement(response, reply.wst, "TokenType", Names::TokenStatus);
    xmlNode* status = AddElement(response, reply.wst, "Status");
    AddElement(status, reply.wst, "Code", isValid ? Names::StatusValid : Names::StatusInvalid);
    AddElement(status, reply.wst, "Reason", reason);
    return Serialize(reply.doc.get());
}

} // namespace DevSts
