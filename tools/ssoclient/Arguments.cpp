#include "Arguments.h"

#include "CommandLine.h"
#include "OneLine.h"

#include "quillon/Exceptions.h"
#include "quillon/MessageFormatter.h"
#include "quillon/xml/Node.h"

using Quillon::MessageFormatter;

namespace {

/** The library is asked, which decides it for every text that it writes. */
bool CanStandInXml(const std::string& text)
{
    try {
        Quillon::Ref<Quillon::Xml::TextNode> node;
        Quillon::Xml::CreateTextNode(node);
        node->SetText(text);
        return true;
    } catch (const Quillon::InvalidArgumentException&) {
        return false;
    }
}

} // namespace

std::string CheckNotEmpty(const std::string& value)
{
    return value.empty() ? "must not be empty" : "";
}

std::string CheckText(const std::string& value)
{
    if (!IsUtf8(value)) {
        return "is not UTF-8";
    }
    return CanStandInXml(value) ? "" : "holds a character that XML does not allow";
}

std::string CheckNotEmptyText(const std::string& value)
{
    return value.empty() ? CheckNotEmpty(value) : CheckText(value);
}

std::string CheckName(const std::string& value)
{
    if (value.empty()) {
        return CheckNotEmpty(value);
    }
    if (!IsUtf8(value)) {
        return "is not UTF-8";
    }
    return HasControls(value) ? "must not hold control characters" : "";
}

std::string CheckLifetime(const std::string& value)
{
    long long seconds = 0;
    // What is no number has been refused before.
    if (ToNumber(value, seconds) && seconds > MaxSeconds) {
        return MessageFormatter::ASPrint("must be at most %1 seconds", MaxSeconds);
    }
    return "";
}
