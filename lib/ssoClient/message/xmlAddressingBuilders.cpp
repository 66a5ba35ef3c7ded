#include "ssoClient/message/xmlAddressingBuilders.h"

#include "quillon/StringUtil.h"
#include "ssoClient/wire/wireNames.h"

#include <boost/smart_ptr/make_shared.hpp>

namespace SsoClient {

namespace {

XMLBuilderPtr WsaTextBuilder(const char* localName, const std::string& text)
{
    return TextElementBuilder("wsa", localName, {{"xmlns:wsa", Wire::WsAddressingNamespace}}, text);
}

/** An id that comes twice would be a message that was sent twice, so it is made by the build. */
class WsaMessageIdBuilder final : public XMLBaseBuilder
{
public:
    void build(Quillon::Ref<Quillon::Xml::ElementNode>& out) const override
    {
        WsaTextBuilder("MessageID", "urn:uuid:" + Quillon::StringUtil::GenerateUuid())->build(out);
    }
};

} // namespace

std::vector<XMLBuilderPtr> WsaHeaderBuilders(const std::string& action, const std::string& to)
{
    return {
        WsaTextBuilder("Action", action),
        boost::make_shared<WsaMessageIdBuilder>(),
        Composite(
            ElementBuilder("wsa", "ReplyTo", {{"xmlns:wsa", Wire::WsAddressingNamespace}}),
            {TextElementBuilder("wsa", "Address", Wire::AnonymousAddress)}),
        WsaTextBuilder("To", to)};
}

} // namespace SsoClient
