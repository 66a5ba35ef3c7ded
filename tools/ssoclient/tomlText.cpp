#include "tomlText.h"

#include <algorithm>
#include <string_view>

namespace {

constexpr char ByteOrderMark[] = "\xEF\xBB\xBF";
constexpr std::string_view Blanks = " \t\r\n";

bool IsForeign(char character)
{
    return static_cast<unsigned char>(character) > 0x7F;
}

/** Walks over a text of TOML. */
class Walk
{
public:
    explicit Walk(std::string_view text)
        : _text(text)
    {}

    /** @return the place; at the end of the text if there is none. */
    std::size_t FindForeign()
    {
        while (_at < _text.size() && !IsForeign(_text[_at])) {
            if (_text[_at] == '#') {
                _at = Find("\n", _at);
            } else if (_startsValue && (_text[_at] == '"' || _text[_at] == '\'')) {
                SkipString();
                _startsValue = false;
            } else {
                _startsValue = MayStartValueBehind(_text[_at]);
                ++_at;
            }
        }
        return _at;
    }

private:
    /** A quote inside of a number or a bare word begins no string: toml++ reads on to its end. */
    bool MayStartValueBehind(char character) const
    {
        constexpr std::string_view Before = " \t\r\n=,";
        const bool isOpening = character == '[' || character == '{';
        return Before.find(character) != std::string_view::npos || (_startsValue && isOpening);
    }

    std::size_t Find(std::string_view what, std::size_t from) const
    {
        return std::min(_text.find_first_of(what, from), _text.size());
    }

    /** Stops behind the string, or at a foreign character that must not stand in it. */
    void SkipString()
    {
        const char quote = _text[_at];
        const bool isLong = _text.substr(_at, 3) == std::string(3, quote);
        const std::string_view end = _text.substr(_at, isLong ? 3 : 1);
        _at += end.size();
        while (_at < _text.size() && _text.substr(_at, end.size()) != end) {
            if (!isLong && _text[_at] == '\n') {
                return; // which is an error
            }
            const bool isEscape = _text[_at] == '\\' && quote == '"';
            if (isEscape && SkipEscape(isLong)) {
                return;
            }
            _at += isEscape ? 0 : 1;
        }
        _at = std::min(_at + end.size(), _text.size());
    }

    /** @return whether it stops at a foreign character. */
    bool SkipEscape(bool isLong)
    {
        ++_at;
        if (!isLong) {
            _at = std::min(_at + 1, _text.size());
            return false;
        }
        const std::size_t next = std::min(_text.find_first_not_of(Blanks, _at), _text.size());
        if (next < _text.size() && IsForeign(_text[next])) {
            _at = next;
            return true;
        }
        _at = std::min(std::max(next, _at + 1), _text.size());
        return false;
    }

    const std::string_view _text;
    std::size_t _at = 0;
    bool _startsValue = true;
};

} // namespace

long FindForeignCharacter(const std::string& text)
{
    const bool hasMark = text.rfind(ByteOrderMark, 0) == 0;
    const std::string_view body = std::string_view(text).substr(hasMark ? 3 : 0);
    const std::size_t place = Walk(body).FindForeign();
    return place == body.size()
               ? 0
               : 1 + std::count(body.begin(), body.begin() + static_cast<long>(place), '\n');
}
