#include "Finding.h"

#include "OneLine.h"
#include "TokenOutput.h"

#include <nlohmann/json.hpp>

using Json = nlohmann::ordered_json;

namespace {

constexpr std::size_t PartWidth = 10;
constexpr char Indent[] = "      ";

std::string ToWord(Health health)
{
    switch (health) {
    case Health::GOOD:
        return "good";
    case Health::NOTE:
        return "note";
    default:
        return "bad";
    }
}

std::string ToLines(const Finding& finding)
{
    std::string word = ToWord(finding.health);
    word.resize(sizeof Indent - 1, ' ');
    std::string part = finding.part;
    part.resize(PartWidth, ' ');
    const std::string line = word + part + ToOneLine(finding.text) + "\n";
    return finding.remedy.empty() ? line
                                  : line + Indent + std::string(PartWidth, ' ') + "-> "
                                        + ToOneLine(finding.remedy) + "\n";
}

Json ToJson(const Finding& finding)
{
    Json json;
    json["result"] = ToWord(finding.health);
    json["part"] = finding.part;
    json["text"] = finding.text;
    json["remedy"] = finding.remedy.empty() ? Json() : Json(finding.remedy);
    return json;
}

} // namespace

void ShowFindings(const std::vector<Finding>& findings, const Presentation& presentation)
{
    std::string lines;
    Json list = Json::array();
    for (const Finding& finding : findings) {
        if (!presentation.quiet || finding.health == Health::BAD) {
            lines += ToLines(finding);
        }
        list.push_back(ToJson(finding));
    }
    constexpr auto Replace = Json::error_handler_t::replace;
    TokenOutput::Print(
        presentation.json ? Json{{"findings", list}}.dump(2, ' ', true, Replace) + "\n" : lines);
}
