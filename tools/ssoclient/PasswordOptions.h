#pragma once

#include "CommandLine.h"

#include <string>

/** The options of who logs on with a password. */
struct PasswordOptions
{
    std::string user;
    std::string file; ///< `-` is standard input; empty: the user is asked

    /** @return the option of the user name. */
    Option AddTo(const Command& command);
};
