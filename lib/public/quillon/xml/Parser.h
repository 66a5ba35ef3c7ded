#pragma once

#include "quillon/Exceptions.h"
#include "quillon/Reader.h"
#include "quillon/xml/Node.h"

namespace Quillon::Xml {

/**
 * The text is not well-formed XML, uses something that is refused (a DOCTYPE, an encoding other
 * than UTF-8) or exceeds a limit. The text says what and where.
 */
class QUILLON_API XMLParseException : public ExceptionOf<XMLParseException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~XMLParseException() override;
};

/**
 * What a document may have. Generous for any real message (an assertion with 1,000 groups is
 * about 100 KB and 6 levels deep), and small enough that a hostile one costs little.
 */
struct ParserLimits
{
    static constexpr std::size_t MaxDocumentBytes = std::size_t{8} * 1024 * 1024;
    static constexpr unsigned MaxDepth = 128;
    static constexpr unsigned MaxAttributes = 256; ///< on one element, declarations included
    static constexpr unsigned MaxNamespaces = 64;  ///< declared on one element
    static constexpr unsigned MaxNamespacesInScope = 256;
};

/** Receives the document that a parser makes. */
class QUILLON_API DocumentHandler : public RefCounted
{
public:
    /** @throws TypeMismatchException  nothing was parsed. */
    virtual Ref<Document> GetDocument() const = 0;

    /** Called by the parser at the end of a document. */
    virtual void SetDocument(const Ref<Document>& document) = 0;
};

/**
 * Reads UTF-8 documents without DOCTYPE. A prefix that nothing declares is not an error here
 * (readers report it in their own words), but canonicalizing it is.
 *
 * Thread safety: one parse at a time. Cost: linear in the size of the text; the memory is up to
 * about 30 times that of the text, if it consists of small nodes.
 */
class QUILLON_API Parser : public RefCounted
{
public:
    /** Parses the whole reader. @throws XMLParseException */
    virtual void Parse(Reader* reader) = 0;

    /** The same for a text in memory, without a copy through a reader. */
    virtual void Parse(std::string_view text) = 0;
};

/**
 * Reads a text without a copy of it: the nodes of the document point into `text`, which must live,
 * and stay as it is, for as long as any of them.
 *
 * Thread safety: any thread. @throws XMLParseException
 */
QUILLON_API Ref<Document> ParseInPlace(const std::string& text);

QUILLON_API Ref<DocumentHandler> CreateXMLDocumentHandler();
QUILLON_API Ref<Parser> CreateXMLParser(DocumentHandler* handler);

/**
 * Writes the element as XML text: names as written, attributes in their order, characters escaped
 * where XML needs it. It declares nothing that the element does not declare itself.
 */
QUILLON_API void Serialize(const ElementNode* element, Writer* writer);

} // namespace Quillon::Xml
