#include "ssoClient/xmlSoapBuilders.h"

#include "ssoClient/wireNames.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <utility>

namespace SsoClient {

XMLBuilderPtr SoapBuilder(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder)
{
    auto header = boost::make_shared<XMLCompositeBuilder>(ElementBuilder("soapenv", "Header"));
    header->Add(std::move(headerBuilder));

    // Some bodies use `wst` without declaring it.
    auto body = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("soapenv", "Body", {{"xmlns:wst", Wire::WsTrustNamespace}}));
    body->Add(std::move(bodyBuilder));

    auto envelope = boost::make_shared<XMLCompositeBuilder>(
        ElementBuilder("soapenv", "Envelope", {{"xmlns:soapenv", Wire::SoapNamespace}}));
    envelope->Add(header).Add(body);
    return envelope;
}

} // namespace SsoClient
