#include "html.h"

#include "OneLine.h"

#include <string_view>

namespace {

constexpr std::string_view Style =
    "body{font:1rem/1.5 system-ui,sans-serif;margin:2rem auto;max-width:60rem;padding:0 1rem;"
    "color:#1b1b1b;background:#fff;overflow-wrap:anywhere}"
    "h1{font-size:1.4rem}"
    "h2{font-size:1.1rem;margin:2rem 0 .5rem;padding-bottom:.2rem;border-bottom:1px solid #bbb}"
    "h3{font-size:1rem;margin:0 0 .3rem}"
    "dl{display:grid;grid-template-columns:10rem 1fr;gap:.5rem 1rem;margin:0}"
    "dt{font-weight:600}"
    "dl dl{grid-template-columns:9rem 1fr;gap:.2rem 1rem;padding-left:.7rem;border-left:3px solid "
    "#ddd}"
    "dl dl dt{font-weight:400;color:#555}"
    "dd{margin:0;min-width:0}"
    "ul,ol{margin:0;padding-left:1.2rem}"
    "article{border:1px solid #ccc;border-radius:.4rem;padding:.6rem .8rem;margin:.6rem 0}"
    "code{font:.9rem/1.5 ui-monospace,monospace}"
    "@media(max-width:40rem){dl,dl dl{grid-template-columns:1fr;gap:0}dd{margin-bottom:.8rem}"
    "dd dd{margin-bottom:.3rem}}";

} // namespace

std::string EscapeForHtml(const std::string& text)
{
    std::string escaped;
    for (const char character : ToOneLine(text)) {
        switch (character) {
        case '&':
            escaped += "&amp;";
            break;
        case '<':
            escaped += "&lt;";
            break;
        case '>':
            escaped += "&gt;";
            break;
        case '"':
            escaped += "&quot;";
            break;
        case '\'':
            escaped += "&#39;";
            break;
        default:
            escaped += character;
        }
    }
    return escaped;
}

std::string WriteHtmlPage(const std::string& title, const std::string& body)
{
    const std::string heading = EscapeForHtml(title);
    return "<!DOCTYPE html>\n<html lang=\"en\"><head><meta charset=\"utf-8\"/>\n"
           "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; style-src "
           "'unsafe-inline'\"/>\n"
           "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\"/>\n<title>"
           + heading + "</title>\n<style>" + std::string(Style) + "</style></head>\n<body><h1>"
           + heading + "</h1>\n" + body + "</body></html>\n";
}
