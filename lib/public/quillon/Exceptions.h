#pragma once

#include "quillon/Export.h"

#include <exception>
#include <string>
#include <vector>

namespace Quillon {

/**
 * What every exception of the library keeps: a message and the call stack at its construction.
 *
 * Thread safety: immutable after construction.
 */
class QUILLON_API Throwable : public std::exception
{
public:
    explicit Throwable(const std::string& message);
    Throwable(const Throwable&) = default;
    Throwable& operator=(const Throwable&) = default;
    ~Throwable() override;

    /** The message, valid as long as the object. */
    const char* what() const noexcept override;

    /** The call stack at construction, one frame a line, innermost first. Costs symbol look-ups. */
    virtual std::string GetBacktrace() const;

    /** Class name, message and call stack, for a diagnostic log. */
    virtual std::string Dump() const;

    /** The innermost frame outside the exception's own constructors, as far as symbols tell. */
    virtual std::string Where() const;

private:
    std::string _message;
    std::vector<void*> _frames;
};

/** An exception that can be copied and raised again without losing its dynamic type. */
class QUILLON_API Exception : public Throwable
{
public:
    using Throwable::Throwable;
    ~Exception() override;

    /** @return a new copy with the dynamic type of this object; the caller owns it. */
    virtual Exception* Clone() const = 0;

    /** Throws a copy with the dynamic type of this object. */
    [[noreturn]] virtual void Throw() const = 0;
};

/**
 * Supplies `Clone` and `Throw` for `Derived`, so that an exception class is one declaration.
 * `Base` is the class above it in the family.
 */
template <class Derived, class Base>
class ExceptionOf : public Base
{
public:
    using Base::Base;

    Exception* Clone() const override { return new Derived(static_cast<const Derived&>(*this)); }
    [[noreturn]] void Throw() const override { throw Derived(static_cast<const Derived&>(*this)); }
};

/** The unqualified name of the dynamic type of `error`, for example "ParseException". */
QUILLON_API std::string GetClassName(const std::exception& error);

/** A bad argument. The text is "Invalid argument : " followed by the given message. */
class QUILLON_API InvalidArgumentException : public ExceptionOf<InvalidArgumentException, Exception>
{
public:
    explicit InvalidArgumentException(const std::string& message);
    ~InvalidArgumentException() override;
};

/** The object is not configured for the operation. */
class QUILLON_API InvalidStateException : public ExceptionOf<InvalidStateException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~InvalidStateException() override;
};

/** An object is not of the kind that the operation needs. */
class QUILLON_API TypeMismatchException : public ExceptionOf<TypeMismatchException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~TypeMismatchException() override;
};

/** Raises a `TypeMismatchException` that names the expected kind and the one found. */
[[noreturn]] QUILLON_API void ThrowTypeMismatchException(
    const std::string& expected, const std::string& found);

/** Text that should be Base64 [RFC 4648 4] is not. */
class QUILLON_API Base64FormatException : public ExceptionOf<Base64FormatException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
    ~Base64FormatException() override;
};

} // namespace Quillon
