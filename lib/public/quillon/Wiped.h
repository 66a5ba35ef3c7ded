#pragma once

#include <algorithm>
#include <cstddef>
#include <string.h>
#include <string>
#include <string_view>
#include <utility>

namespace Quillon {

/** Overwrites memory, also where the compiler sees that nobody reads it any more. */
inline void Wipe(void* memory, std::size_t size) noexcept
{
    explicit_bzero(memory, size);
}

/** Empties `text` and overwrites all its memory, also what was cut off its end before. */
inline void Wipe(std::string& text) noexcept
{
    text.resize(text.capacity());
    Wipe(text.data(), text.size());
    text.clear();
}

/**
 * Text that may be a secret. Its memory is overwritten before it is given back, whatever became of
 * the text meanwhile, and nothing copies it by accident. What a caller copies out of `Get` is the
 * caller's to wipe.
 *
 * Thread safety: as a `std::string`.
 */
class Wiped
{
public:
    Wiped() = default;

    /** A copy; `text` is the caller's to wipe. */
    explicit Wiped(const std::string& text) { Append(text); }

    /** Takes the text over: what is left of `text` is empty and overwritten. */
    explicit Wiped(std::string&& text)
    {
        Append(text);
        Wipe(text);
    }

    Wiped(const Wiped&) = delete;
    Wiped& operator=(const Wiped&) = delete;
    Wiped(Wiped&& other) noexcept { _text.swap(other._text); }

    /** The old text goes with `other` and is overwritten there. */
    Wiped& operator=(Wiped&& other) noexcept
    {
        _text.swap(other._text);
        return *this;
    }
    ~Wiped() { Clear(); }

    const std::string& Get() const noexcept { return _text; }

    /** `text` may be a part of this one. */
    void Append(std::string_view text)
    {
        if (HasRoomFor(text.size())) {
            _text.append(text);
        } else {
            AppendToLarger(text);
        }
    }

    /** Only of a text that is not empty. */
    void RemoveLast() noexcept { _text.pop_back(); }

    void Clear() noexcept { Wipe(_text); }

    /** Hands the text over, from now on the caller's to wipe; this one is empty afterwards. */
    std::string Release() noexcept { return std::exchange(_text, std::string()); }

private:
    // A short text would stand in the string object itself, parts of it even after it has grown.
    static constexpr std::size_t MinCapacity = 64;

    bool HasRoomFor(std::size_t size) const noexcept
    {
        return size <= _text.capacity() - _text.size() && _text.capacity() >= MinCapacity;
    }

    void AppendToLarger(std::string_view text)
    {
        std::string larger;
        larger.reserve(std::max({_text.size() + text.size(), 2 * _text.capacity(), MinCapacity}));
        larger.append(_text).append(text);
        _text.swap(larger);
        Wipe(larger);
    }

    std::string _text;
};

} // namespace Quillon
