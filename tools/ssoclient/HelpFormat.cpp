#include "HelpFormat.h"

#include <sys/ioctl.h>

#include <algorithm>
#include <sstream>

#include <unistd.h>

namespace {

constexpr std::size_t DefaultWidth = 80;
constexpr std::size_t MinWidth = 50; // narrower ones break the lines themselves
constexpr std::size_t MaxWidth = 120;
constexpr std::size_t NameIndent = 2;
constexpr std::size_t TextColumn = 28;

std::size_t GetWidth()
{
    winsize size = {};
    const bool isKnown = ::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
    return isKnown ? std::clamp<std::size_t>(size.ws_col, MinWidth, MaxWidth) : DefaultWidth;
}

/** Appends the words of `text` to what stands in the last line up to `column`. */
std::string Flow(std::string lines, std::size_t column, const std::string& text, std::size_t indent)
{
    const std::size_t width = GetWidth();
    std::istringstream words(text);
    bool isFirst = true;
    for (std::string word; words >> word; isFirst = false) {
        if (!isFirst && column + 1 + word.size() > width) {
            lines += "\n" + std::string(indent, ' ');
            column = indent;
        } else if (!isFirst) {
            lines += ' ';
            ++column;
        }
        lines += word;
        column += word.size();
    }
    return lines + "\n";
}

} // namespace

std::string Wrap(const std::string& text, std::size_t indent)
{
    return Flow("", 0, text, indent);
}

std::string FormatEntry(const std::string& name, const std::string& description)
{
    std::string line = std::string(NameIndent, ' ') + name;
    if (line.size() + 2 > TextColumn) {
        line += "\n" + std::string(TextColumn, ' ');
    } else {
        line.resize(TextColumn, ' ');
    }
    return Flow(line, TextColumn, description, TextColumn);
}
