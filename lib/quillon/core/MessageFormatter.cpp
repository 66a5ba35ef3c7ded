#include "quillon/MessageFormatter.h"

namespace Quillon {

std::string MessageFormatter::Expand(
    std::string_view format, std::initializer_list<std::string> texts)
{
    std::string message;
    for (std::size_t i = 0; i < format.size(); ++i) {
        const bool placeholder = format[i] == '%' && i + 1 < format.size() && format[i + 1] >= '1'
                                 && format[i + 1] <= '9';
        const std::size_t index =
            placeholder ? static_cast<std::size_t>(format[i + 1] - '1') : texts.size();
        if (index < texts.size()) {
            message += texts.begin()[index];
            ++i;
        } else {
            message += format[i];
        }
    }
    return message;
}

} // namespace Quillon
