#include "devsts/wire/NegotiationReader.h"

#include "devsts/wire/Base64.h"
#include "devsts/wire/Names.h"

#include <algorithm>

namespace DevSts {

namespace {

void RequireAttributeValue(const xmlNode* element, const char* name, const char* expected)
{
    const std::string found = RequireAttribute(element, {"", name});
    if (found != expected) {
        throw ShapeError(
            "The " + std::string(name) + " of the BinaryExchange must be '" + expected + "', not '"
            + found + "'");
    }
}

bool IsBlank(char character)
{
    return character == ' ' || character == '\t' || character == '\r' || character == '\n';
}

// OpenSSL's decoder overlooks much; only what it would itself write is Base64 here.
std::string ReadBase64(std::string text)
{
    text.erase(std::remove_if(text.begin(), text.end(), IsBlank), text.end());
    if (text.empty()) {
        throw ShapeError("The BinaryExchange is empty");
    }
    std::string bytes = DecodeBase64(text);
    if (bytes.empty() || EncodeBase64(bytes) != text) {
        throw ShapeError("The BinaryExchange is not Base64");
    }
    return bytes;
}

} // namespace

NegotiationLeg ReadNegotiationLeg(const xmlNode* request, const xmlNode* binaryExchange)
{
    AllowAttributes(request, {{"", "Context"}});
    NegotiationLeg leg;
    leg.context = RequireAttribute(request, {"", "Context"});
    if (leg.context.empty()) {
        throw ShapeError("The Context is empty");
    }
    AllowAttributes(binaryExchange, {{"", "ValueType"}, {"", "EncodingType"}});
    RequireAttributeValue(binaryExchange, "ValueType", Names::Spnego);
    RequireAttributeValue(binaryExchange, "EncodingType", Names::Base64Binary);
    leg.bytes = ReadBase64(TextOf(binaryExchange));
    return leg;
}

NegotiationLeg ReadContinuedRequest(const xmlNode* response)
{
    ChildCursor children(response);
    const xmlNode* binaryExchange = children.Take({Names::Wst, "BinaryExchange"});
    children.RequireEnd();
    return ReadNegotiationLeg(response, binaryExchange);
}

} // namespace DevSts
