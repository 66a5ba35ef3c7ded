#include "devsts/wire/Fault.h"

#include "devsts/wire/Names.h"
#include "devsts/wire/Xml.h"

#include <cstring>

namespace DevSts {

namespace FaultCodes {

const FaultCode Client{"soapenv", Names::Soap, "Client"};
const FaultCode Server{"soapenv", Names::Soap, "Server"};
const FaultCode InvalidRequest{"wst", Names::Wst, "InvalidRequest"};
const FaultCode RequestFailed{"wst", Names::Wst, "RequestFailed"};
const FaultCode FailedAuthentication{"wst", Names::Wst, "FailedAuthentication"};
const FaultCode InvalidSecurityToken{"wst", Names::Wst, "InvalidSecurityToken"};
const FaultCode ExpiredData{"wst", Names::Wst, "ExpiredData"};
const FaultCode InvalidTimeRange{"wst", Names::Wst, "InvalidTimeRange"};
const FaultCode InvalidScope{"wst", Names::Wst, "InvalidScope"};
const FaultCode UnableToRenew{"wst", Names::Wst, "UnableToRenew"};
const FaultCode FailedCheck{"wsse", Names::Wsse, "FailedCheck"};

} // namespace FaultCodes

std::string WriteFault(const Fault& fault)
{
    const XmlDocument doc = NewDocument("soapenv", {Names::Soap, "Envelope"});
    xmlNode* envelope = xmlDocGetRootElement(doc.get());
    xmlNode* body = AddElement(envelope, envelope->ns, "Body");
    xmlNode* element = AddElement(body, envelope->ns, "Fault");
    const FaultCode& code = fault.Code();
    if (std::strcmp(code.ns, Names::Soap) != 0) {
        DeclareNamespace(element, code.prefix, code.ns);
    }
    // The children of Fault are in no namespace. [SOAP11 4.4]
    AddElement(element, nullptr, "faultcode", std::string(code.prefix) + ":" + code.local);
    AddElement(element, nullptr, "faultstring", fault.what());
    return Serialize(doc.get());
}

} // namespace DevSts
