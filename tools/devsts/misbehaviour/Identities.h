#pragma once

#include "devsts/state/State.h"

#include <string>
#include <vector>

namespace DevSts {

/** What a server shows of itself. */
struct ShownIdentity
{
    PrivateKey key;
    std::vector<Certificate> chain; ///< its own certificate first; empty for none
};

/**
 * An identity below the authority of `state` for the server at `host`, with the fault of that name:
 * see the table in the source.
 *
 * @throws std::invalid_argument  there is no such fault.
 */
ShownIdentity IssueIdentity(const std::string& fault, const State& state, const std::string& host);

} // namespace DevSts
