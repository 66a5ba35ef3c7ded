#include "Duration.h"

#include <array>

namespace {

struct ShownUnit
{
    long long seconds;
    const char* name;
};
constexpr std::array<ShownUnit, 4> ShownUnits = {
    {{86400, "d"}, {3600, "h"}, {60, "min"}, {1, "s"}}};

} // namespace

std::string DescribeDuration(long long microseconds)
{
    constexpr long long MicrosPerSecond = 1'000'000;
    long long seconds = microseconds / MicrosPerSecond;
    std::string text;
    for (std::size_t i = 0, shown = 0; i < ShownUnits.size() && shown < 2; ++i) {
        const long long count = seconds / ShownUnits[i].seconds;
        if (count > 0 || shown > 0) {
            text += (shown > 0 ? " " : "") + std::to_string(count) + " " + ShownUnits[i].name;
            seconds -= count * ShownUnits[i].seconds;
            ++shown;
        }
    }
    return text.empty() ? "0 s" : text;
}
