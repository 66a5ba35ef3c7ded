#pragma once

#include "quillon/Export.h"

#include <initializer_list>
#include <string>
#include <string_view>

namespace Quillon {

/**
 * Turns a value into the text that stands for its placeholder. Specialise it for a type of your
 * own with a static `std::string Format(const T*)`, which is handed null for a null pointer.
 */
template <class T>
struct ToStringFormatter;

/** Messages with numbered placeholders `%1` to `%9`. */
class QUILLON_API MessageFormatter
{
public:
    /**
     * Replaces `%1` to `%9` in `format` by the arguments: strings as they are, booleans as
     * `true` and `false`, integers in decimal, anything else through `ToStringFormatter`. Text
     * that an argument brings in is never expanded again; a placeholder without an argument
     * stays as it is.
     */
    template <class... Arguments>
    static std::string ASPrint(std::string_view format, const Arguments&... arguments)
    {
        return Expand(format, {ToText(arguments)...});
    }

private:
    static std::string Expand(std::string_view format, std::initializer_list<std::string> texts);

    static std::string ToText(const std::string& value) { return value; }
    static std::string ToText(std::string_view value) { return std::string(value); }
    static std::string ToText(const char* value) { return value == nullptr ? "(null)" : value; }
    static std::string ToText(bool value) { return value ? "true" : "false"; }
    static std::string ToText(int value) { return std::to_string(value); }
    static std::string ToText(long value) { return std::to_string(value); }
    static std::string ToText(long long value) { return std::to_string(value); }
    static std::string ToText(unsigned value) { return std::to_string(value); }
    static std::string ToText(unsigned long value) { return std::to_string(value); }
    static std::string ToText(unsigned long long value) { return std::to_string(value); }

    template <class T>
    static std::string ToText(const T* value)
    {
        return ToStringFormatter<T>::Format(value);
    }

    template <class T>
    static std::string ToText(const T& value)
    {
        return ToStringFormatter<T>::Format(&value);
    }
};

} // namespace Quillon
