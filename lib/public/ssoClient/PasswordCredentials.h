#pragma once

#include "quillon/Wiped.h"

#include <string>
#include <utility>

namespace SsoClient {

/**
 * A user name and its password, which is overwritten before its memory goes back. What a caller
 * makes it of is the caller's to wipe.
 */
struct PasswordCredentials
{
    std::string userName;
    std::string password;

    PasswordCredentials(std::string user, const std::string& secret)
        : userName(std::move(user))
        , password(secret)
    {}
    PasswordCredentials(const PasswordCredentials&) = default;
    PasswordCredentials(PasswordCredentials&&) = default;
    ~PasswordCredentials() { Quillon::Wipe(password); }

    /** By value: the old password goes with `other` and is overwritten there. */
    PasswordCredentials& operator=(PasswordCredentials other) noexcept
    {
        std::swap(userName, other.userName);
        std::swap(password, other.password);
        return *this;
    }
};

} // namespace SsoClient
