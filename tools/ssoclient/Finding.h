#pragma once

#include "Presentation.h"

#include <string>
#include <vector>

enum class Health
{
    GOOD,
    NOTE, ///< nothing is wrong, but somebody should know
    BAD
};

/** What an examination of a service came to, in words for a person. */
struct Finding
{
    Health health;
    std::string part; ///< of the service that was looked at, in one word
    std::string text;
    std::string remedy; ///< empty if there is nothing to do
};

/** Writes the findings to standard output as lines, or as JSON. @throws UsageError */
void ShowFindings(const std::vector<Finding>& findings, const Presentation& presentation);
