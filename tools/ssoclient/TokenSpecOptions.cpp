#include "TokenSpecOptions.h"

void TokenSpecOptions::AddTo(CLI::App& command)
{
    command.add_option("--lifetime", spec.tokenLifetimeSec, "Lifetime of the token in seconds")
        ->capture_default_str()
        ->type_name("SEC");
    command.add_flag("--renewable", spec.renewable, "Ask for a token that can be renewed");
    command.add_flag("--delegable", spec.delegable, "Ask for a token that can be delegated");
    command
        .add_option_function<std::string>(
            "--delegate-to",
            [this](const std::string& name) { spec.delegateTo = name; },
            "Ask for a token delegated to this principal")
        ->type_name("NAME");
    command
        .add_option("--audience", spec.audienceRestriction, "Restrict the token to these parties")
        ->type_name("URI");
}
