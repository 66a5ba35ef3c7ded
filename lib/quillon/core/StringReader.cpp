#include "quillon/Reader.h"

#include <utility>

namespace Quillon {

namespace {

class StringReaderImpl : public Reader
{
public:
    explicit StringReaderImpl(std::string text)
        : _text(std::move(text))
    {}

    std::size_t Read(char* buffer, std::size_t size) override
    {
        const std::size_t count = _text.copy(buffer, size, _position);
        _position += count;
        return count;
    }

    std::size_t GetSizeHint() const noexcept override { return _text.size() - _position; }

private:
    std::string _text;
    std::size_t _position = 0;
};

} // namespace

Ref<Reader> CreateStringReader(std::string text)
{
    return Ref<Reader>(new StringReaderImpl(std::move(text)));
}

} // namespace Quillon
