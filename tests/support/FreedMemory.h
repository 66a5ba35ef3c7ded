#pragma once

#include <cstdlib>
#include <cstring>
#include <malloc.h>
#include <new>
#include <string>
#include <string_view>

// Replaces the operators that allocate memory for the whole program, so only one source of a
// program includes this.

/**
 * Watches for the time of its life what is given back to the heap, and remembers whether a text
 * stood in it. For one thread.
 */
class FreedMemory
{
public:
    /** @param text  should be like nothing else in the process. */
    explicit FreedMemory(std::string_view text) noexcept
    {
        text.copy(_text, sizeof _text);
        _size = text.size() < sizeof _text ? text.size() : sizeof _text;
        _found = false;
        _watched = this;
    }
    FreedMemory(const FreedMemory&) = delete;
    FreedMemory& operator=(const FreedMemory&) = delete;
    ~FreedMemory() { _watched = nullptr; }

    bool HeldTheText() const noexcept { return _found; }

    static void Free(void* memory) noexcept
    {
        if (_watched != nullptr && memory != nullptr) {
            _watched->_found =
                _watched->_found
                || ::memmem(memory, ::malloc_usable_size(memory), _watched->_text, _watched->_size)
                       != nullptr;
        }
        std::free(memory);
    }

private:
    static inline FreedMemory* _watched = nullptr;
    char _text[64] = {};
    std::size_t _size = 0;
    bool _found = false;
};

/** What the program calls before each allocation, if anything. It allocates nothing itself. */
inline void (*beforeAllocation)() = nullptr;

void* operator new(std::size_t size)
{
    if (beforeAllocation != nullptr) {
        beforeAllocation();
    }
    if (void* memory = std::malloc(size)) {
        return memory;
    }
    throw std::bad_alloc();
}
void* operator new[](std::size_t size)
{
    return ::operator new(size);
}
void* operator new(std::size_t size, const std::nothrow_t& /*tag*/) noexcept
{
    return std::malloc(size);
}
void* operator new[](std::size_t size, const std::nothrow_t& /*tag*/) noexcept
{
    return std::malloc(size);
}
void operator delete(void* memory) noexcept
{
    FreedMemory::Free(memory);
}
void operator delete[](void* memory) noexcept
{
    FreedMemory::Free(memory);
}
void operator delete(void* memory, std::size_t /*size*/) noexcept
{
    FreedMemory::Free(memory);
}
void operator delete[](void* memory, std::size_t /*size*/) noexcept
{
    FreedMemory::Free(memory);
}
