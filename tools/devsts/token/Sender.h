#pragma once

#include "devsts/state/Users.h"
#include "devsts/token/Assertion.h"

#include <optional>
#include <string>

namespace DevSts {

/** The proof that a request comes from whoever holds a certain key. */
struct KeyProof
{
    std::string certificateDer;
    std::string signatureId;
};

/** Who sent a request, and how that is known. */
struct Sender
{
    const User* user = nullptr;         ///< who logged on; null if a token was presented
    std::optional<Assertion> presented; ///< the verified token, if one was presented
    std::optional<KeyProof> proof;      ///< set if the request is signed
    std::string authnContext;
};

} // namespace DevSts
