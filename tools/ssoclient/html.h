#pragma once

#include <string>

/** Text to stand between tags or quotes: on one line, with nothing in it that is markup or steers
 * what shows it. See `ToOneLine`. */
std::string EscapeForHtml(const std::string& text);

/**
 * A page of HTML that holds everything that it needs, loads nothing and runs no script.
 *
 * @param title  plain text, which is also the page's heading.
 * @param body   markup.
 */
std::string WriteHtmlPage(const std::string& title, const std::string& body);
