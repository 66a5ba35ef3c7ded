#pragma once

#include <string>

namespace Quillon::Service {

/**
 * Gives `text` the form in which it is logged: UTF-8 without characters that end a line, steer a
 * terminal or change the order of what is read. Their octets are written as `\xNN`, and so are
 * octets that are no UTF-8. A text that has `\xNN` itself is told from that: its backslash is
 * written as `\x5c`.
 */
std::string ToLogText(const std::string& text);

} // namespace Quillon::Service
