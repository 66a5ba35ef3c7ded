#include "quillon/Reader.h"

#include "quillon/Wiped.h"

namespace Quillon {

namespace {

/** What is written may carry a password. */
class StringWriterImpl : public StringWriter
{
public:
    void Write(const char* bytes, std::size_t size) override { _text.Append({bytes, size}); }
    const std::string& GetString() const noexcept override { return _text.Get(); }
    std::string TakeString() noexcept override { return _text.Release(); }

private:
    Wiped _text;
};

} // namespace

Ref<StringWriter> CreateStringWriter()
{
    return Ref<StringWriter>(new StringWriterImpl());
}

} // namespace Quillon
