#include "quillon/Reader.h"

#include <algorithm>
#include <string.h>
#include <utility>

namespace Quillon {

namespace {

/** What is written may carry a password, so no block that is given back keeps it. */
class StringWriterImpl : public StringWriter
{
public:
    ~StringWriterImpl() override { Wipe(_text); }

    void Write(const char* bytes, std::size_t size) override
    {
        const std::size_t needed = _text.size() + size;
        if (needed > _text.capacity()) {
            std::string larger;
            larger.reserve(std::max(needed, 2 * _text.capacity()));
            larger.append(_text);
            _text.swap(larger);
            Wipe(larger);
        }
        _text.append(bytes, size);
    }

    const std::string& GetString() const noexcept override { return _text; }
    std::string TakeString() noexcept override { return std::exchange(_text, std::string()); }

private:
    static void Wipe(std::string& text) noexcept { explicit_bzero(text.data(), text.size()); }

    std::string _text;
};

} // namespace

Ref<StringWriter> CreateStringWriter()
{
    return Ref<StringWriter>(new StringWriterImpl());
}

} // namespace Quillon
