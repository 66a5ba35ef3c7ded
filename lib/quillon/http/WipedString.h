#pragma once

#include <memory>
#include <string.h>
#include <vector>

namespace Quillon::Http {

/** Overwrites memory before it gives it back, so that no secret stays behind in the heap. */
template <class T>
struct WipingAllocator
{
    using value_type = T;

    WipingAllocator() = default;
    template <class U>
    explicit WipingAllocator(const WipingAllocator<U>& /*other*/) noexcept
    {}

    // The names that the standard library asks for.
    // NOLINTBEGIN(readability-identifier-naming)
    T* allocate(std::size_t count) { return std::allocator<T>().allocate(count); }
    void deallocate(T* memory, std::size_t count) noexcept
    {
        explicit_bzero(memory, count * sizeof(T));
        std::allocator<T>().deallocate(memory, count);
    }
    // NOLINTEND(readability-identifier-naming)

    friend bool operator==(const WipingAllocator&, const WipingAllocator&) noexcept { return true; }
};

/** Bytes that may hold a password; a vector, because a string keeps short texts in itself. */
using WipedBytes = std::vector<char, WipingAllocator<char>>;

} // namespace Quillon::Http
