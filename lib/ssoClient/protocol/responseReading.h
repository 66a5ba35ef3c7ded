#pragma once

#include "quillon/xml/Node.h"

#include <initializer_list>
#include <string>
#include <string_view>

/** What the readers of the service's replies share. Elements are matched by local name. */
namespace SsoClient {

/** Throws the `SsoException` for a reply that is not built as expected. */
[[noreturn]] void ThrowUnexpectedFormat();

/** Follows a path of local names, taking the first match at each step; null if one is missing. */
const Quillon::Xml::ElementNode* FindDescendant(
    const Quillon::Xml::ElementNode& element, std::initializer_list<std::string_view> path);

/** The same, but a missing step is an unexpected format. */
const Quillon::Xml::ElementNode& RequireDescendant(
    const Quillon::Xml::ElementNode& element, std::initializer_list<std::string_view> path);

/** An assertion out of a reply as text of its own, whose signature still verifies. */
std::string ToAssertionText(const Quillon::Xml::ElementNode& assertion);

} // namespace SsoClient
