#pragma once

#include "quillon/xml/Parser.h"
#include "ssoClient/message/xmlCommonBuilders.h"

#include <string>

inline Quillon::Ref<Quillon::Xml::ElementNode> Build(const SsoClient::XMLBaseBuilder& builder)
{
    Quillon::Ref<Quillon::Xml::ElementNode> element;
    builder.build(element);
    return element;
}

inline std::string ToText(const Quillon::Xml::ElementNode& element)
{
    const Quillon::Ref<Quillon::StringWriter> writer = Quillon::CreateStringWriter();
    Quillon::Xml::Serialize(&element, writer.get());
    return writer->TakeString();
}

/** What the builder puts on the wire. */
inline std::string ToText(const SsoClient::XMLBuilderPtr& builder)
{
    return ToText(*Build(*builder));
}
