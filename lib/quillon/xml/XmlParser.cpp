#include "quillon/xml/Parser.h"

#include "core/quote.h"
#include "xml/TreeBuilder.h"
#include "xml/parserVersion.h"
#include "xml/sourceCheck.h"

#include <libxml/SAX2.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>
#include <libxml/xmlerror.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <memory>
#include <mutex>
#include <vector>

namespace Quillon::Xml {

namespace {

struct ParserContextDeleter
{
    void operator()(xmlParserCtxt* context) const noexcept { xmlFreeParserCtxt(context); }
};
using ParserContextOwner = std::unique_ptr<xmlParserCtxt, ParserContextDeleter>;

/** The nodes of a typical token take one and a half times the memory of its text. */
constexpr std::size_t EstimateNodes(std::size_t sourceSize) noexcept
{
    return sourceSize + sourceSize / 2 + 1024;
}

std::string_view ToView(const xmlChar* text) noexcept
{
    return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

/** Where the character begins that the octet at `position` belongs to [RFC 3629 3]. */
std::size_t FindCharacterStart(std::string_view text, std::size_t position) noexcept
{
    while (position > 0 && (static_cast<unsigned char>(text[position]) & 0xC0U) == 0x80U) {
        --position;
    }
    return position;
}

/** A message of the parser in one line of printable text. */
std::string CleanMessage(const char* message)
{
    std::string text = message == nullptr ? "unknown error" : message;
    text.erase(text.find_last_not_of('\n') + 1);
    // It may repeat names of the document, which are long only to be a nuisance.
    constexpr std::size_t MaxLength = 500;
    if (text.size() > MaxLength) {
        text.replace(FindCharacterStart(text, MaxLength), std::string::npos, "...");
    }
    for (char& byte : text) {
        if (static_cast<unsigned char>(byte) < 0x20U) {
            byte = ' ';
        }
    }
    return text;
}

/**
 * One run of the parser. The handlers are called from C code, so no exception may leave them:
 * the first failure is kept, the parser is stopped, and `Run` raises it.
 */
class SaxRun
{
public:
    SaxRun(xmlParserCtxt& context, TreeBuilder& builder) noexcept
        : _context(context)
        , _builder(builder)
    {}

    void Run()
    {
        *_context.sax = GetHandlers();
        _context.userData = this;
        // NOENT makes `&amp;` in an attribute arrive as `&` and not as `&#38;`; there are no other
        // entities to replace, as a DOCTYPE ends the run.
        xmlCtxtUseOptions(&_context, XML_PARSE_NONET | XML_PARSE_NOENT);
        xmlParseDocument(&_context);
        if (_failure) {
            std::rethrow_exception(_failure);
        }
        if (_context.wellFormed == 0) {
            throw XMLParseException("Not well-formed");
        }
    }

private:
    static xmlSAXHandler GetHandlers() noexcept
    {
        xmlSAXHandler handlers;
        std::memset(&handlers, 0, sizeof handlers);
        handlers.initialized = XML_SAX2_MAGIC;
        handlers.startDocument = &OnStartDocument;
        handlers.internalSubset = &OnDoctype;
        handlers.startElementNs = &OnStartElement;
        handlers.endElementNs = &OnEndElement;
        handlers.characters = &OnCharacters;
        // Called where the host has turned off libxml2's global default to keep blanks.
        handlers.ignorableWhitespace = &OnCharacters;
        handlers.cdataBlock = &OnCharacters;
        handlers.comment = &OnComment;
        handlers.processingInstruction = &OnProcessingInstruction;
        handlers.serror = &OnError;
        return handlers;
    }

    static SaxRun& From(void* data) noexcept { return *static_cast<SaxRun*>(data); }

    /** Does one step of the work; after the first failure nothing is done any more. */
    template <class Step>
    void Guard(Step step) noexcept
    {
        if (_failure) {
            return;
        }
        try {
            step();
        } catch (...) {
            _failure = std::current_exception();
            xmlStopParser(&_context);
        }
    }

    /** The same for a step whose failures do not say where they are. */
    template <class Step>
    void GuardHere(Step step) noexcept
    {
        Guard([&] {
            try {
                step();
            } catch (const XMLParseException& error) {
                throw XMLParseException(error.what() + GetPosition());
            }
        });
    }

    std::string GetPosition() const
    {
        return " at line " + std::to_string(_context.input->line) + ", column "
               + std::to_string(_context.input->col);
    }

    static void OnStartDocument(void* data)
    {
        SaxRun& run = From(data);
        run.GuardHere([&run] { run.RequireDeclaration(); });
    }

    /** [XML 2.8]: whatever the declaration says must be what the text was checked to be. */
    void RequireDeclaration() const
    {
        const std::string_view version = ToView(_context.version);
        if (version != "1.0") {
            throw XMLParseException("XML version " + Quote(version) + " is not supported");
        }
        const xmlChar* declared =
            _context.encoding != nullptr ? _context.encoding : _context.input->encoding;
        if (declared != nullptr && xmlStrcasecmp(declared, BAD_CAST "UTF-8") != 0) {
            throw XMLParseException("Encoding " + Quote(ToView(declared)) + " is not UTF-8");
        }
    }

    static void OnDoctype(
        void* data,
        const xmlChar* /*name*/,
        const xmlChar* /*publicId*/,
        const xmlChar* /*systemId*/)
    {
        From(data).GuardHere([] { throw XMLParseException("A DOCTYPE is not accepted"); });
    }

    static void OnStartElement(
        void* data,
        const xmlChar* /*localName*/,
        const xmlChar* /*prefix*/,
        const xmlChar* /*uri*/,
        int namespaceCount,
        const xmlChar** namespaces,
        int attributeCount,
        int /*defaultedCount*/,
        const xmlChar** attributes)
    {
        SaxRun& run = From(data);
        run.GuardHere([&] {
            run._builder.StartElement(TagEvent{
                reinterpret_cast<const char*>(run._context.input->cur),
                namespaces,
                static_cast<unsigned>(namespaceCount),
                attributes,
                static_cast<unsigned>(attributeCount)});
        });
    }

    static void OnEndElement(
        void* data, const xmlChar* /*localName*/, const xmlChar* /*prefix*/, const xmlChar* /*uri*/)
    {
        SaxRun& run = From(data);
        run.GuardHere([&run] { run._builder.EndElement(); });
    }

    static void OnCharacters(void* data, const xmlChar* text, int length)
    {
        SaxRun& run = From(data);
        run.GuardHere([&] {
            run._builder.Characters(
                {reinterpret_cast<const char*>(text), static_cast<std::size_t>(length)});
        });
    }

    static void OnComment(void* data, const xmlChar* text)
    {
        SaxRun& run = From(data);
        run.GuardHere([&] { run._builder.Comment(ToView(text)); });
    }

    static void OnProcessingInstruction(void* data, const xmlChar* target, const xmlChar* text)
    {
        SaxRun& run = From(data);
        run.GuardHere([&] { run._builder.ProcessingInstruction(ToView(target), ToView(text)); });
    }

    static void OnError(void* data, xmlError* error)
    {
        // An undeclared prefix stays readable as text; canonicalizing it is refused later.
        const bool isTolerated = error->level == XML_ERR_WARNING
                                 || (error->domain == XML_FROM_NAMESPACE
                                     && error->code == XML_NS_ERR_UNDEFINED_NAMESPACE);
        if (!isTolerated) {
            From(data).Guard([error] {
                throw XMLParseException(
                    CleanMessage(error->message) + " at line " + std::to_string(error->line)
                    + ", column " + std::to_string(error->int2));
            });
        }
    }

    xmlParserCtxt& _context;
    TreeBuilder& _builder;
    std::exception_ptr _failure;
};

ParserContextOwner MakeContext()
{
    static std::once_flag initialized;
    std::call_once(initialized, &xmlInitParser);
    return ParserContextOwner(xmlNewParserCtxt());
}

/**
 * A parser for one text. The next one of the thread gets it too, unless this one failed, or took
 * more memory than a token has it take: its dictionary keeps every name it has seen.
 */
class ThreadsParser
{
public:
    /** @param source  is read where it is; the octet after it is NUL. */
    explicit ThreadsParser(std::string_view source)
        : _context(Idle ? std::move(Idle) : MakeContext())
    {
        // A string input has no buffer of its own: the parser neither copies nor moves the text.
        xmlParserInput* input =
            _context == nullptr
                ? nullptr
                : xmlNewStringInputStream(
                    _context.get(), reinterpret_cast<const xmlChar*>(source.data()));
        if (input == nullptr || inputPush(_context.get(), input) < 0) {
            throw std::bad_alloc();
        }
    }

    void Run(TreeBuilder& builder)
    {
        SaxRun(*_context, builder).Run();
        xmlCtxtReset(_context.get());
        if (xmlDictGetUsage(_context->dict) <= MostKept && _context->maxatts <= MostAttributes) {
            Idle = std::move(_context);
        }
    }

private:
    static constexpr std::size_t MostKept = std::size_t{16} * 1024; // octets
    static constexpr int MostAttributes = 256;                      // of libxml2, five for each

    static thread_local ParserContextOwner Idle;

    ParserContextOwner _context;
};

thread_local ParserContextOwner ThreadsParser::Idle;

class DocumentImpl final : public Document
{
public:
    DocumentImpl(Ref<Arena> arena, ElementNode* root)
        : _arena(std::move(arena))
        , _root(root)
    {}

    ElementNode* GetRootElement() const noexcept override { return _root; }
    Node* GetFirstChild() const noexcept override { return _arena->GetFirstTopLevel(); }

private:
    Ref<Arena> _arena;
    ElementNode* _root;
};

/** An arena of a size that fits the text, with a NUL-terminated copy of it. */
Ref<Arena> CreateArena(std::size_t sourceSize, char*& source)
{
    Ref<Arena> arena = Arena::Create(ArenaContent::PARSED, sourceSize + EstimateNodes(sourceSize));
    source = static_cast<char*>(arena->Allocate(sourceSize + 1));
    source[sourceSize] = '\0';
    arena->SetSource({source, sourceSize});
    return arena;
}

Ref<Document> ParseInArena(const Ref<Arena>& arena)
{
    const std::string_view source = arena->GetSource();
    CheckSource(source);
    TreeBuilder builder(arena, source);
    ThreadsParser(source).Run(builder);
    return Ref<Document>(new DocumentImpl(arena, builder.Finish()));
}

class DocumentHandlerImpl final : public DocumentHandler
{
public:
    Ref<Document> GetDocument() const override
    {
        if (!_document) {
            ThrowTypeMismatchException("document", "nothing");
        }
        return _document;
    }

    void SetDocument(const Ref<Document>& document) override { _document = document; }

private:
    Ref<Document> _document;
};

/** Reads everything, but not much more than a document may have. */
std::string ReadAll(Reader& reader)
{
    std::string text;
    std::size_t size = 0;
    while (size <= ParserLimits::MaxDocumentBytes) {
        text.resize(
            size
            + std::clamp<std::size_t>(reader.GetSizeHint(), 4096, ParserLimits::MaxDocumentBytes));
        const std::size_t count = reader.Read(text.data() + size, text.size() - size);
        size += count;
        if (count == 0) {
            break;
        }
    }
    text.resize(size);
    return text;
}

class ParserImpl final : public Parser
{
public:
    explicit ParserImpl(DocumentHandler* handler)
        : _handler(handler)
    {}

    void Parse(Reader* reader) override { Parse(ReadAll(*reader)); }

    void Parse(std::string_view text) override
    {
        if (text.size() > ParserLimits::MaxDocumentBytes) {
            CheckSource(text); // raises the error before anything is copied
        }
        char* source = nullptr;
        const Ref<Arena> arena = CreateArena(text.size(), source);
        std::memcpy(source, text.data(), text.size());
        _handler->SetDocument(ParseInArena(arena));
    }

private:
    Ref<DocumentHandler> _handler;
};

} // namespace

XMLParseException::~XMLParseException() = default;

Ref<Document> ParseInPlace(const std::string& text)
{
    const std::size_t size = std::min(text.size(), ParserLimits::MaxDocumentBytes);
    const Ref<Arena> arena = Arena::Create(ArenaContent::PARSED, EstimateNodes(size));
    arena->SetSource(text);
    return ParseInArena(arena);
}

Ref<DocumentHandler> CreateXMLDocumentHandler()
{
    return Ref<DocumentHandler>(new DocumentHandlerImpl);
}

Ref<Parser> CreateXMLParser(DocumentHandler* handler)
{
    return Ref<Parser>(new ParserImpl(handler));
}

// libxml2 has it as one number: 20914 is 2.9.14.
std::string GetParserVersion()
{
    const int number = std::atoi(xmlParserVersion);
    return std::to_string(number / 10000) + "." + std::to_string(number / 100 % 100) + "."
           + std::to_string(number % 100);
}

} // namespace Quillon::Xml
