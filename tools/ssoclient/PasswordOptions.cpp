#include "PasswordOptions.h"

#include "Arguments.h"

Option PasswordOptions::AddTo(const Command& command)
{
    const Option userOption =
        command.AddOption("--user", user, "User name").Check(CheckName).ValueName("NAME");
    command
        .AddOption(
            "--password-file",
            file,
            "File whose first line is the password, - for standard input (default: ask for it)")
        .Check(CheckNotEmpty)
        .ValueName("FILE");
    return userOption;
}
