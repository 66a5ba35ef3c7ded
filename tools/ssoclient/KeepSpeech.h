#pragma once

#include "ExchangeRecord.h"
#include "KeepRecord.h"
#include "Presentation.h"

#include <exception>
#include <string>

/** What `ssoclient keep` says while it goes on: each event is a line of standard error. */
class KeepSpeech
{
public:
    /** @param exchanges  with the service, for hints; must outlive this. */
    KeepSpeech(const Presentation& presentation, const ExchangeRecord& exchanges);

    /** Nobody who wants to hear of failures alone is told that. */
    void TellNews(const std::string& text) const;
    void TellProblem(const std::string& text) const;

    /** The text, or as JSON the record. */
    void TellToken(const KeepRecord& record, const std::string& text) const;

    /** The same of a failure, with a hint if the presentation shows them. */
    void TellFailure(
        const KeepRecord& record, const std::string& text, const std::exception& failure) const;

private:
    Presentation _presentation;
    const ExchangeRecord& _exchanges;
};
