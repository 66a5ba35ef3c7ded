#pragma once

#include <string.h>
#include <string>

namespace SsoClient {

/** A copy of a secret, which is overwritten before its memory goes back. */
struct WipedText
{
    std::string text;

    explicit WipedText(const std::string& original)
        : text(original)
    {}
    WipedText(const WipedText&) = delete;
    WipedText& operator=(const WipedText&) = delete;
    ~WipedText() { explicit_bzero(text.data(), text.size()); }
};

} // namespace SsoClient
