#pragma once

#include "ssoClient/Advice.h"
#include "ssoClient/Delegate.h"
#include "ssoClient/Descriptions.h"

#include <boost/function.hpp>

#include <string>
#include <vector>

/**
 * One-line texts of values for the log. Programs read them, so each blank, comma and bracket is
 * part of the format, the missing ones included.
 */
namespace SsoClient {

std::string WriteDelegate(const Delegate* delegate);
std::string WriteAdviceAttribute(const AdviceAttribute* attribute);
std::string WriteAdvice(const Advice* advice);

/**
 * The descriptions of `items`, separated by ", ". An item that describes itself as nothing before
 * there is any text gets no separator after it.
 */
template <class T>
std::string AsString(
    const std::vector<T>& items, const boost::function<std::string(const T*)>& describe)
{
    std::string text;
    for (const T& item : items) {
        if (!text.empty()) {
            text += ", ";
        }
        text += describe(&item);
    }
    return text;
}

std::string WriteTokenSpec(const TokenSpec& spec);

} // namespace SsoClient
