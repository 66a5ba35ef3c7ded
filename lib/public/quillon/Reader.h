#pragma once

#include "quillon/Ref.h"

#include <cstddef>
#include <string>

namespace Quillon {

/** A source of bytes, read once from front to back by one thread at a time. */
class QUILLON_API Reader : public RefCounted
{
public:
    /** Reads up to `size` bytes into `buffer`. @return how many; 0 only at the end. */
    virtual std::size_t Read(char* buffer, std::size_t size) = 0;

    /** How many bytes are known to be left, or 0 when that is not known. Only a hint. */
    virtual std::size_t GetSizeHint() const noexcept { return 0; }
};

/** A reader over its own copy of `text`. */
QUILLON_API Ref<Reader> CreateStringReader(std::string text);

/** A destination of bytes, for one thread at a time. */
class QUILLON_API Writer : public RefCounted
{
public:
    virtual void Write(const char* bytes, std::size_t size) = 0;
};

/** A writer that gathers everything in a string. */
class QUILLON_API StringWriter : public Writer
{
public:
    virtual const std::string& GetString() const noexcept = 0;

    /** Hands the text over; the writer is empty afterwards. */
    virtual std::string TakeString() noexcept = 0;
};

QUILLON_API Ref<StringWriter> CreateStringWriter();

} // namespace Quillon
