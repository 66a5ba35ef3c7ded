#include "Failure.h"

#include "Hints.h"
#include "OneLine.h"
#include "Terminal.h"

#include <nlohmann/json.hpp>

#include <iostream>

using Json = nlohmann::ordered_json;

namespace {

struct Failure
{
    std::string className;
    std::string message;
    std::string hint; ///< empty if there is none
    ExitCode exitCode;
};

/** One line of ASCII. Octets that are not UTF-8 become U+FFFD, because JSON has no other way. */
std::string ToJson(const Failure& failure)
{
    Json error;
    error["class"] = failure.className;
    error["message"] = failure.message;
    error["hint"] = failure.hint.empty() ? Json() : Json(failure.hint);
    error["exitCode"] = static_cast<int>(failure.exitCode);
    return Json{{"error", error}}.dump(-1, ' ', true, Json::error_handler_t::replace);
}

} // namespace

void ReportFailure(
    const std::exception& error,
    const std::optional<Quillon::Http::ExchangeFacts>& exchange,
    const Presentation& presentation)
{
    const Failure failure = {
        Quillon::GetClassName(error),
        Shorten(error.what(), MaxMessageBytes),
        FindHint(error, exchange),
        GetExitCode(error)};
    if (presentation.json) {
        std::cerr << ToJson(failure) + "\n" << std::flush;
        return;
    }
    Notice(failure.className + ": " + failure.message);
    if (!failure.hint.empty() && presentation.ShowsHints()) {
        Notice("hint: " + failure.hint);
    }
}
