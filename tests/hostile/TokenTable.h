#pragma once

#include "Verdict.h"

#include <iosfwd>
#include <string>
#include <vector>

namespace HostileTests {

/** One token file and what must come of it, as the table beside it says. */
struct TokenCase
{
    std::string file;  ///< relative to the folder of tokens
    std::string rule;  ///< the rule that a refused one breaks
    std::string about; ///< what is special about it
    std::vector<std::string> trusted;
    long long nowMicros = 0;
    long long toleranceSec = 0;
    std::string facts;             ///< of an accepted token, as `DescribeFacts` writes them
    std::vector<Refusal> refusals; ///< of a refused one: any of these
};

std::ostream& operator<<(std::ostream& out, const TokenCase& tokenCase);

/** The lines of the tables of all folders. Throws `std::exception` if it cannot be read. */
const std::vector<TokenCase>& GetTokenTable();

/** The line of one file, for example "accepted/bearer.xml". */
const TokenCase& GetTokenCase(const std::string& file);

std::string ReadToken(const TokenCase& tokenCase);
Conditions GetConditions(const TokenCase& tokenCase);

/** `text` with `to` in the one place where `from` stands. Throws unless there is just one. */
std::string ReplaceOnce(const std::string& text, const std::string& from, const std::string& to);

} // namespace HostileTests
