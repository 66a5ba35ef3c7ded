#include "quillon/xml/Parser.h"
#include "xml/Escape.h"
#include "xml/treeWalk.h"

namespace Quillon::Xml {

namespace {

/** Writes the nodes of a tree as they are met. */
class SerializingVisitor
{
public:
    explicit SerializingVisitor(OutputBuffer& out)
        : _out(out)
    {}

    void Enter(const ElementNode& element)
    {
        _out.Append('<');
        _out.Append(element.GetName());
        for (const Attribute& attribute : element.GetAttributes()) {
            _out.Append(' ');
            _out.Append(attribute.name);
            _out.Append("=\"");
            AppendAttributeValue(_out, attribute.value);
            _out.Append('"');
        }
        _out.Append(element.GetFirstChild() == nullptr ? "/>" : ">");
    }

    void Leave(const ElementNode& element)
    {
        if (element.GetFirstChild() != nullptr) {
            _out.AppendEndTag(element.GetName());
        }
    }

    void Visit(const TextNode& text) { AppendText(_out, text.GetText()); }

    void Visit(const CommentNode& comment)
    {
        _out.Append("<!--");
        _out.Append(comment.GetText());
        _out.Append("-->");
    }

    void Visit(const ProcessingInstructionNode& instruction)
    {
        AppendProcessingInstruction(_out, instruction);
    }

private:
    OutputBuffer& _out;
};

} // namespace

void Serialize(const ElementNode* element, Writer* writer)
{
    WriterSink sink(*writer);
    OutputBuffer out(sink);
    SerializingVisitor visitor(out);
    WalkTree(*element, nullptr, visitor);
    out.Flush();
}

} // namespace Quillon::Xml
