#pragma once

#include "ssoClient/Leg.h"

#include <stdexcept>

/** Just enough of DER [X.690] to read and write the messages of SPNEGO. */
namespace Der {

using Bytes = SsoClient::Leg;

inline Bytes Concat(std::initializer_list<Bytes> parts)
{
    Bytes all;
    for (const Bytes& part : parts) {
        all.insert(all.end(), part.begin(), part.end());
    }
    return all;
}

inline Bytes Write(unsigned char tag, const Bytes& content)
{
    const std::size_t size = content.size();
    Bytes header{tag};
    if (size < 0x80) {
        header.push_back(static_cast<unsigned char>(size));
    } else {
        header.insert(
            header.end(),
            {0x82, static_cast<unsigned char>(size >> 8), static_cast<unsigned char>(size)});
    }
    return Concat({header, content});
}

/** The content of the first element in `elements` that has the tag. */
inline Bytes Find(const Bytes& elements, unsigned char tag)
{
    std::size_t at = 0;
    while (at + 2 <= elements.size()) {
        const unsigned char found = elements[at];
        std::size_t size = elements[at + 1];
        at += 2;
        if (size >= 0x80) {
            const std::size_t count = size - 0x80;
            size = 0;
            for (std::size_t i = 0; i < count; ++i) {
                size = size << 8 | elements.at(at++);
            }
        }
        if (at + size > elements.size()) {
            break;
        }
        if (found == tag) {
            return {elements.begin() + at, elements.begin() + at + size};
        }
        at += size;
    }
    throw std::runtime_error("no element with tag " + std::to_string(tag));
}

} // namespace Der
