#pragma once

#include "quillon/Reader.h"
#include "quillon/Wiped.h"
#include "quillon/xml/Node.h"

#include <array>
#include <cstring>
#include <string>
#include <string_view>

namespace Quillon::Xml {

/** Where octets go in large pieces. */
class ByteSink
{
public:
    virtual void Write(const char* bytes, std::size_t size) = 0;

protected:
    ~ByteSink() = default;
};

class WriterSink final : public ByteSink
{
public:
    explicit WriterSink(Writer& writer) noexcept
        : _writer(writer)
    {}
    void Write(const char* bytes, std::size_t size) override { _writer.Write(bytes, size); }

private:
    Writer& _writer;
};

/** Gathers many small pieces of text into few calls of a sink. Wiped when done with. */
class OutputBuffer
{
public:
    // The octets are left as they are: none is read before it was written.
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init)
    explicit OutputBuffer(ByteSink& sink) noexcept
        : _sink(sink)
    {}
    ~OutputBuffer() { Wipe(_bytes.data(), _size > _used ? _size : _used); }
    OutputBuffer(const OutputBuffer&) = delete;
    OutputBuffer& operator=(const OutputBuffer&) = delete;

    void Append(char byte)
    {
        if (_size == _bytes.size()) {
            Flush();
        }
        _bytes[_size++] = byte;
    }

    void Append(std::string_view text)
    {
        if (text.size() > _bytes.size() - _size) {
            Flush();
            if (text.size() > _bytes.size()) {
                _sink.Write(text.data(), text.size());
                _flushed += text.size();
                return;
            }
        }
        Copy(_bytes.data() + _size, text.data(), text.size());
        _size += text.size();
    }

    /** `</name>`. */
    void AppendEndTag(std::string_view name)
    {
        constexpr std::size_t Marks = 3;
        if (name.size() + Marks > _bytes.size() - _size) {
            Append("</");
            Append(name);
            Append('>');
            return;
        }
        char* to = _bytes.data() + _size;
        to[0] = '<';
        to[1] = '/';
        Copy(to + 2, name.data(), name.size());
        to[2 + name.size()] = '>';
        _size += name.size() + Marks;
    }

    /** How much has been appended in all. */
    std::size_t GetPosition() const noexcept { return _flushed + _size; }

    /**
     * Reads back what has been appended since `position`.
     *
     * @return false, and `text` untouched, if a part of it has gone to the sink already.
     */
    bool ReadBack(std::size_t position, std::string& text) const
    {
        if (position < _flushed) {
            return false;
        }
        text.assign(_bytes.data() + (position - _flushed), GetPosition() - position);
        return true;
    }

    void Flush()
    {
        if (_size != 0) {
            _sink.Write(_bytes.data(), _size);
        }
        _flushed += _size;
        _used = _size > _used ? _size : _used;
        _size = 0;
    }

private:
    /** Most pieces are names of a few octets, for which a call costs more than the copy. */
    static void Copy(char* to, const char* from, std::size_t size)
    {
        if (size > 16) {
            std::memcpy(to, from, size);
        } else if (size >= 8) {
            CopyEnds<8>(to, from, size);
        } else if (size >= 4) {
            CopyEnds<4>(to, from, size);
        } else {
            for (std::size_t i = 0; i < size; ++i) {
                to[i] = from[i];
            }
        }
    }

    /** Copies the first and the last `Half` octets, which overlap or touch. */
    template <std::size_t Half>
    static void CopyEnds(char* to, const char* from, std::size_t size)
    {
        std::array<char, Half> first = {};
        std::array<char, Half> last = {};
        std::memcpy(first.data(), from, Half);
        std::memcpy(last.data(), from + size - Half, Half);
        std::memcpy(to, first.data(), Half);
        std::memcpy(to + size - Half, last.data(), Half);
    }

    ByteSink& _sink;
    std::size_t _size = 0;
    std::size_t _used = 0;
    std::size_t _flushed = 0;
    std::array<char, 4096> _bytes;
};

/** Character data with `&`, `<`, `>` and carriage return escaped [C14N 2.3]. */
void AppendText(OutputBuffer& out, std::string_view text);

/** An attribute value with `&`, `<`, `"`, tab, line feed and carriage return escaped [C14N 2.3]. */
void AppendAttributeValue(OutputBuffer& out, std::string_view value);

void AppendProcessingInstruction(OutputBuffer& out, const ProcessingInstructionNode& instruction);

} // namespace Quillon::Xml
