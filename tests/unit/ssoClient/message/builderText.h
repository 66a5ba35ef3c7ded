#pragma once

#include "quillon/xml/Parser.h"
#include "ssoClient/message/xmlCommonBuilders.h"

#include <gmock/gmock.h>

#include <string>

/** When messages are written. */
inline constexpr char Now[] = "2011-07-05T09:03:07.042Z";

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

/** All that standard error gets when an invariant of the builders breaks at `unit:number`. */
inline auto StopsAt(const std::string& expression, const std::string& place)
{
    return testing::StrEq("PanicVerify failed: " + expression + " (lib/ssoClient/" + place + ")\n");
}
