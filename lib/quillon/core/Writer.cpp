#include "quillon/Reader.h"

#include <utility>

namespace Quillon {

namespace {

class StringWriterImpl : public StringWriter
{
public:
    void Write(const char* bytes, std::size_t size) override { _text.append(bytes, size); }
    const std::string& GetString() const noexcept override { return _text; }
    std::string TakeString() noexcept override { return std::exchange(_text, std::string()); }

private:
    std::string _text;
};

} // namespace

Ref<StringWriter> CreateStringWriter()
{
    return Ref<StringWriter>(new StringWriterImpl());
}

} // namespace Quillon
