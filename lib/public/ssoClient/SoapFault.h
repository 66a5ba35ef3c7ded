#pragma once

#include "quillon/xml/QName.h"

#include <boost/function.hpp>

#include <string>
#include <vector>

namespace SsoClient {

struct SoapFaultCode
{
    std::string text; ///< as it is written, prefix included
    /** What it means; empty if the prefix is not declared. */
    Quillon::Xml::QName name;
};

struct SoapFaultText
{
    std::string language; ///< `xml:lang`; empty in SOAP 1.1
    std::string text;
};

/**
 * All that a fault says [SOAP11 4.4] [SOAP12-1 5.4]. Nothing in it is checked, and its texts may be
 * long and may have control characters: they are the service's. What is absent is empty.
 */
struct SoapFault
{
    SoapFaultCode code;
    std::vector<SoapFaultCode> subcodes; ///< SOAP 1.2, the most general first
    std::vector<SoapFaultText> texts;    ///< the fault string, or the reason in each language
    std::string node;                    ///< the fault actor, or the node
    std::string role;                    ///< SOAP 1.2
    /** The whole element as canonical XML [EXC-C14N]; as it is written if it has no such form. */
    std::string detail;
};

/**
 * Shown every fault before the exception for it is thrown, on the thread of the operation. What it
 * throws leaves the operation instead.
 */
using FaultObserver = boost::function<void(const SoapFault&)>;

} // namespace SsoClient
