#include "KeepSpeech.h"

#include "Hints.h"
#include "Terminal.h"

#include <nlohmann/json.hpp>

#include <iostream>

using Json = nlohmann::ordered_json;

namespace {

void Print(const std::string& line)
{
    std::cerr << line + "\n" << std::flush;
}

} // namespace

KeepSpeech::KeepSpeech(const Presentation& presentation, const ExchangeRecord& exchanges)
    : _presentation(presentation)
    , _exchanges(exchanges)
{}

void KeepSpeech::TellNews(const std::string& text) const
{
    if (!_presentation.quiet) {
        TellProblem(text);
    }
}

void KeepSpeech::TellProblem(const std::string& text) const
{
    if (_presentation.json) {
        Print(Json{{"notice", text}}.dump(-1, ' ', true, Json::error_handler_t::replace));
    } else {
        Notice(text);
    }
}

void KeepSpeech::TellToken(const KeepRecord& record, const std::string& text) const
{
    if (_presentation.quiet) {
        return;
    }
    if (_presentation.json) {
        Print(record.ToJson());
    } else {
        Notice(text);
    }
}

void KeepSpeech::TellFailure(
    const KeepRecord& record, const std::string& text, const std::exception& failure) const
{
    if (_presentation.json) {
        Print(record.ToJson());
        return;
    }
    Notice(text);
    const std::string hint = FindHint(failure, _exchanges.GetLatest());
    if (!hint.empty() && _presentation.ShowsHints()) {
        Notice("hint: " + hint);
    }
}
