#include "Arguments.h"
#include "Commands.h"
#include "OneLine.h"
#include "Profile.h"
#include "TokenOutput.h"

#include <nlohmann/json.hpp>

#include <memory>

namespace {

using Json = nlohmann::ordered_json;

std::string ToJson(const Profile& profile)
{
    Json json;
    json["name"] = profile.name;
    json["file"] = profile.file;
    json["values"] = profile.values;
    return Json{{"profile", json}}.dump(2, ' ', true, Json::error_handler_t::replace) + "\n";
}

/** As options that could be typed in its place. */
std::string ToLines(const Profile& profile)
{
    std::string lines;
    for (const auto& [key, values] : profile.values) {
        for (const std::string& value : values) {
            std::string option = "--";
            option.append(key).append(" ").append(value);
            lines.append(ToOneLine(option)).append("\n");
        }
    }
    return lines;
}

ExitCode Show(const std::string& name, const Presentation& presentation)
{
    const Profile profile = ReadProfile(name);
    if (!presentation.quiet) {
        TokenOutput::Print(presentation.json ? ToJson(profile) : ToLines(profile));
    }
    return ExitCode::DONE;
}

} // namespace

void AddProfileCommand(const Command& parent, Invocation& invocation)
{
    const Command profile = parent.AddCommand("profile", "Profiles, which keep options");
    const Command command = profile.AddCommand("show", "Show what a profile stands for");
    const auto name = std::make_shared<std::string>();
    command.AddOption("NAME", *name, "The profile").Required().Check(CheckNotEmpty);
    invocation.presentation.AddTo(command);
    command.ShowExample("ssoclient profile show production");
    command.WhenNamed([name, &invocation] {
        invocation.action = [name, &invocation] { return Show(*name, invocation.presentation); };
    });
}
