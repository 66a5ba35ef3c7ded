#pragma once

#include "quillon/xml/Node.h"
#include "ssoClient/SamlToken.h"

#include <boost/smart_ptr/shared_ptr.hpp>

#include <map>
#include <string>
#include <vector>

namespace SsoClient {

/**
 * Describes one element of a message, with everything in it. A message is first composed of
 * builders and only then built.
 *
 * There is no virtual destructor: a builder is made straight into a `boost::shared_ptr` of its
 * own class and never deleted through this interface.
 *
 * Thread safety: any number of threads may build one tree of builders at once. Only a builder of
 * `InsertSamlTokenBuilder` that is built by itself, or as the root of a composite, hands out the
 * same element each time, and so belongs to one thread.
 */
class XMLBaseBuilder
{
public:
    /** Stores a new element in `out`, in place of what it held. */
    virtual void build( // NOLINT(readability-identifier-naming)
        Quillon::Ref<Quillon::Xml::ElementNode>& out) const = 0;

protected:
    ~XMLBaseBuilder() = default;
};

using XMLBuilderPtr = boost::shared_ptr<const XMLBaseBuilder>;

/**
 * Attribute values by name, both exactly as they are to be written: a prefix stands in the name,
 * and a namespace declaration is an entry like any other. They are written in the order of the
 * map, whatever the order in which they are listed.
 */
using AttributeMap = std::map<std::string, std::string>;

/** An element with child elements. */
class XMLCompositeBuilder final : public XMLBaseBuilder
{
public:
    /** @param rootBuilder  makes the element itself; null stops the process. */
    explicit XMLCompositeBuilder(XMLBuilderPtr rootBuilder);

    /**
     * Appends a child; not while another thread builds this object. Null is passed over, so that
     * an optional part can be handed in as it is.
     */
    XMLCompositeBuilder& Add(XMLBuilderPtr child);

    void build(Quillon::Ref<Quillon::Xml::ElementNode>& out) const override;

private:
    XMLBuilderPtr _rootBuilder;
    std::vector<XMLBuilderPtr> _children;
};

/**
 * The element that `root` makes, with `children` in their order, so that a function that makes a
 * tree can be read as one. Null children are passed over.
 */
boost::shared_ptr<XMLCompositeBuilder> Composite(
    XMLBuilderPtr root, std::vector<XMLBuilderPtr> children);

/** A builder for each of `items`, in their order, by the factory `make`. */
template <class Items, class Make>
std::vector<XMLBuilderPtr> BuildersOf(const Items& items, Make make)
{
    std::vector<XMLBuilderPtr> builders;
    builders.reserve(items.size());
    for (const auto& item : items) {
        builders.push_back(make(item));
    }
    return builders;
}

/** An empty element. */
XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName);
XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName, AttributeMap attributes);

/** An element with one text node, also for an empty text. */
XMLBuilderPtr TextElementBuilder(
    std::string prefix, std::string localName, const std::string& text);
XMLBuilderPtr TextElementBuilder(
    std::string prefix, std::string localName, AttributeMap attributes, const std::string& text);

/**
 * The assertion element of `token`, parsed once from its XML and otherwise untouched, so that its
 * signature still verifies. Every build hands out the same element; among the children of a
 * composite it stands once, and every further build of that composite inserts a copy.
 *
 * @throws Quillon::Xml::XMLParseException  the token's XML is not well-formed.
 */
XMLBuilderPtr InsertSamlTokenBuilder(const SamlToken& token);

/**
 * Builds `child` and makes it the last child of `parent`. An element that stands in a tree already
 * stays there, and a copy of it is appended.
 */
void BuildAndAppendChildTo(Quillon::Xml::ElementNode* parent, const XMLBaseBuilder& child);

/** Sets the attribute that `attribute` names. */
void ElementDefineAttribute(
    Quillon::Xml::ElementNode* element, const AttributeMap::value_type& attribute);

} // namespace SsoClient
