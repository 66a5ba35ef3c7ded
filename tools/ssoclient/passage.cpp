#include "passage.h"

#include <algorithm>
#include <regex>

namespace {

/** What is shown at each side of the place. */
constexpr std::size_t MaxSideBytes = 40;

/** Begins a message about a text that the file does not show. */
constexpr char HiddenText[] = "In what was encrypted: ";

struct Place
{
    std::size_t line = 0; ///< 1 is the first; 0 if none is named
    std::size_t column = 0;
};

Place FindPlace(const std::string& message)
{
    static const std::regex pattern(R"( at (?:line )?(\d{1,7}),(?: column )?(\d{1,7}))");
    std::smatch parts;
    if (!std::regex_search(message, parts, pattern)) {
        return {};
    }
    return {std::stoul(parts[1]), std::stoul(parts[2])};
}

/** Where a line begins; beyond the text if it has not as many. */
std::size_t FindLine(const std::string& text, std::size_t line)
{
    std::size_t at = 0;
    for (std::size_t current = 1; current < line && at <= text.size(); ++current) {
        at = std::min(text.find('\n', at), text.size()) + 1;
    }
    return at;
}

} // namespace

std::string FindPassage(const std::string& message, const std::string& text)
{
    if (message.find(HiddenText) != std::string::npos) {
        return "";
    }
    const Place place = FindPlace(message.substr(0, MaxSideBytes * MaxSideBytes));
    const std::size_t begin = place.line == 0 ? text.size() : FindLine(text, place.line);
    if (begin >= text.size()) {
        return "";
    }
    const std::string line = text.substr(begin, text.find('\n', begin) - begin);
    const std::size_t at = std::min(place.column == 0 ? 0 : place.column - 1, line.size());
    const std::size_t from = at - std::min(at, MaxSideBytes);
    return line.substr(from, at - from) + "[here]" + line.substr(at, MaxSideBytes);
}
