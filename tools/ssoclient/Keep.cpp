#include "Commands.h"
#include "Keeping.h"

#include <memory>

void AddKeepCommand(const Command& parent, Invocation& invocation)
{
    const Command command =
        parent.AddCommand("keep", "Keep a token file fresh until the process is ended");
    const auto options = std::make_shared<KeepOptions>();
    options->AddTo(command, invocation.exchanges);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient keep token.xml --method certificate \\\n      --url "
                        "https://sts.example.com/sts --trust sts.pem \\\n      --key service.key "
                        "--cert service.pem --renewable --lifetime 3600 \\\n      --status "
                        "token.json --exec 'systemctl reload myserver'");
    command.WhenNamed([options, &invocation] {
        invocation.action = [options, &invocation] {
            Keep(*options, invocation.presentation, invocation.exchanges);
            return ExitCode::DONE;
        };
    });
}
