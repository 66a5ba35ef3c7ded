#pragma once

#include "ssoClient/SamlToken.h"
#include "ssoClient/TokenSpec.h"
#include "ssoClient/message/xmlRequestBuilders.h"
#include "ssoClient/protocol/SPNegoResponse.h"

#include <string>

/** The messages of a SPNEGO negotiation, which WS-Trust calls an exchange [WST13 8]. */
namespace SsoClient {

/** `wst:BinaryExchange` with one leg of the client [WST13 8.4]. */
XMLBuilderPtr WstSPNegoBinExchangeBuilder(const Leg& leg);

/** An issue request that carries the first leg. */
class XMLBodyBuilderInitialSPNego final : public XMLBaseBuilder
{
public:
    XMLBodyBuilderInitialSPNego(
        SamlToken::ConfirmationType confirmation,
        const TokenSpec& spec,
        const Leg& leg,
        IssueForm form = IssueForm());

    /** Every build names its negotiation by another context id. */
    void build(Quillon::Ref<Quillon::Xml::ElementNode>& out) const override;

private:
    SamlToken::ConfirmationType _confirmation;
    TokenSpec _spec;
    Leg _leg;
    IssueForm _form;
};

/** The client's answer to a leg of the service. */
class XMLBodyBuilderContinuedSPNego final : public XMLBaseBuilder
{
public:
    XMLBodyBuilderContinuedSPNego(const std::string& contextId, const Leg& leg);

    void build(Quillon::Ref<Quillon::Xml::ElementNode>& out) const override;

private:
    std::string _contextId;
    Leg _leg;
};

/**
 * Reads the service's answer out of the SOAP body of a reply.
 *
 * @throws SsoException  it is not built as expected.
 */
SPNegoResponse ExtractSPNegoResponse(const Quillon::Xml::ElementNode& soapBody);

} // namespace SsoClient
