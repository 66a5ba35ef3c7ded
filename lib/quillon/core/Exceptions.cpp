#include "quillon/Exceptions.h"

#include <cxxabi.h>
#include <dlfcn.h>
#include <execinfo.h>

#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string_view>
#include <typeinfo>

namespace Quillon {

namespace {

/** Deep enough to reach the caller of any operation of the library. */
constexpr int MaxFrames = 64;

std::vector<void*> CaptureFrames()
{
    std::array<void*, MaxFrames> frames{};
    const int count = backtrace(frames.data(), MaxFrames);
    return std::vector<void*>(frames.begin(), frames.begin() + count);
}

std::string Demangle(const char* name)
{
    int status = 0;
    const std::unique_ptr<char, decltype(&std::free)> text(
        abi::__cxa_demangle(name, nullptr, nullptr, &status), &std::free);
    return status == 0 ? text.get() : name;
}

/** The function around `address`; empty if the loaded objects export no name for it. */
std::string FunctionName(const void* address)
{
    Dl_info info{};
    return dladdr(address, &info) != 0 && info.dli_sname != nullptr ? Demangle(info.dli_sname)
                                                                    : std::string();
}

std::string DescribeFrame(const void* address)
{
    Dl_info info{};
    const bool known = dladdr(address, &info) != 0;
    const char* object = known && info.dli_fname != nullptr ? info.dli_fname : "?";
    const auto base = known ? reinterpret_cast<std::uintptr_t>(info.dli_fbase) : 0;

    std::array<char, 24> offset{};
    std::snprintf(
        offset.data(),
        offset.size(),
        "+0x%llx",
        static_cast<unsigned long long>(reinterpret_cast<std::uintptr_t>(address) - base));
    const std::string function = FunctionName(address);
    return (function.empty() ? "?" : function) + " in " + object + offset.data();
}

/** Cuts the name after the last `::` that stands outside template and function arguments. */
std::string_view Unqualified(std::string_view name)
{
    int depth = 0;
    for (std::size_t i = name.size(); i-- > 0;) {
        if (name[i] == '>' || name[i] == ')') {
            ++depth;
        } else if (name[i] == '<' || name[i] == '(') {
            --depth;
        } else if (name[i] == ':' && depth == 0) {
            return name.substr(i + 1);
        }
    }
    return name;
}

/** Whether the demangled function is a constructor, `Scope::Name::Name(...)`. */
bool IsConstructor(std::string_view function)
{
    const std::string_view qualified = function.substr(0, function.find('('));
    const std::string_view name = Unqualified(qualified);
    if (name.empty() || name.size() + 2 >= qualified.size()) {
        return false;
    }
    return Unqualified(qualified.substr(0, qualified.size() - name.size() - 2)) == name;
}

} // namespace

Throwable::Throwable(const std::string& message)
    : _message(message)
    , _frames(CaptureFrames())
{}

Throwable::~Throwable() = default;

const char* Throwable::what() const noexcept
{
    return _message.c_str();
}

std::string Throwable::GetBacktrace() const
{
    std::string text;
    for (const void* frame : _frames) {
        text += DescribeFrame(frame);
        text += '\n';
    }
    return text;
}

std::string Throwable::Dump() const
{
    return GetClassName(*this) + ": " + _message + "\n" + GetBacktrace();
}

std::string Throwable::Where() const
{
    for (const void* frame : _frames) {
        // The frame helper of this unit has no exported name, the constructors of the exceptions
        // that are not inlined have one.
        const std::string function = FunctionName(frame);
        const bool own = frame == _frames.front() && function.empty();
        if (!own && !IsConstructor(function)) {
            return DescribeFrame(frame);
        }
    }
    return "?";
}

Exception::~Exception() = default;

std::string GetClassName(const std::exception& error)
{
    return std::string(Unqualified(Demangle(typeid(error).name())));
}

InvalidArgumentException::InvalidArgumentException(const std::string& message)
    : ExceptionOf("Invalid argument : " + message)
{}

InvalidArgumentException::~InvalidArgumentException() = default;
InvalidStateException::~InvalidStateException() = default;
TypeMismatchException::~TypeMismatchException() = default;
Base64FormatException::~Base64FormatException() = default;

void ThrowTypeMismatchException(const std::string& expected, const std::string& found)
{
    throw TypeMismatchException("Type mismatch: expected " + expected + ", found " + found);
}

} // namespace Quillon
