#pragma once

#include "quillon/xml/Node.h"

#include <string>

// What a reference may name: the defence against signature wrapping stands here.
namespace Quillon::Xml::Security {

/**
 * Requires that a reference's URI names `parent` and could be read by nobody as naming anything
 * else: it is empty and `parent` is the root of its document; or it is `#` and an ID that this
 * element, and no other of the whole document, carries in any attribute that someone may take
 * for an ID.
 *
 * @throws XmlSecurityException
 */
void RequireTarget(const std::string& uri, const ElementNode& parent);

/**
 * The one element of the tree around `context` that a reference to be signed names.
 *
 * @param uri  `#` and an ID.
 * @throws XmlSecurityException  no element has the ID, or several have.
 */
const ElementNode& FindTarget(const std::string& uri, const ElementNode& context);

/** The first node of the document whose root is `root`; null if it was not parsed. */
const Node* GetFirstTopLevel(const ElementNode& root) noexcept;

} // namespace Quillon::Xml::Security
