#include "devsts/misbehaviour/Misbehaviour.h"

#include "devsts/misbehaviour/tableText.h"

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>
#include <stdexcept>

namespace DevSts {

namespace {

using Json = nlohmann::json;

/** An array of the name, and then a text, a number, or both. */
Act ReadAct(const Json& json)
{
    Act act;
    act.name = json.at(0).get<std::string>();
    for (std::size_t i = 1; i < json.size(); ++i) {
        if (json[i].is_string()) {
            act.text = json[i].get<std::string>();
        } else {
            act.number = json[i].get<long>();
        }
    }
    return act;
}

std::vector<Act> ReadActs(const Json& json)
{
    std::vector<Act> acts;
    std::transform(json.begin(), json.end(), std::back_inserter(acts), &ReadAct);
    return acts;
}

TlsFaults ReadTls(const Json& json)
{
    TlsFaults faults;
    faults.certificate = json.value("certificate", faults.certificate);
    faults.version = json.value("version", "");
    faults.ciphers = json.value("ciphers", "");
    faults.instead = ReadActs(json.value("instead", Json::array()));
    faults.cutsHandshake = json.value("cutsHandshake", false);
    faults.changesHandshake = json.value("changesHandshake", false);
    if (json.contains("verdict")) {
        faults.verdict = json["verdict"].get<int>();
    }
    return faults;
}

Misbehaviour ReadRow(const Json& json)
{
    Misbehaviour row;
    row.name = json.at("name").get<std::string>();
    row.about = json.at("about").get<std::string>();
    const std::string over = json.value("over", json.contains("tls") ? "https" : "both");
    row.isOverHttp = over != "https";
    row.isOverHttps = over != "http";
    if (json.contains("every")) {
        row.parameter = json["every"].at("first").get<long>();
    }
    row.tls = ReadTls(json.value("tls", Json::object()));
    row.acts = ReadActs(json.value("acts", Json::parse(R"([["read"], ["write", "{reply}"]])")));
    return row;
}

std::vector<Misbehaviour> ReadTable()
{
    std::string text;
    for (const char* const row : GetMisbehaviourRows()) {
        text += (text.empty() ? "" : ",") + std::string(row);
    }
    const Json table = Json::parse(text);
    std::vector<Misbehaviour> rows;
    std::transform(table.begin(), table.end(), std::back_inserter(rows), &ReadRow);
    return rows;
}

long ReadParameter(const Misbehaviour& row, const std::string& text)
{
    long parameter = 0;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, parameter);
    if (!row.parameter || error != std::errc() || rest != end || parameter < 0) {
        throw std::invalid_argument(row.name + " takes no \"" + text + "\"");
    }
    return parameter;
}

} // namespace

const std::vector<Misbehaviour>& ListMisbehaviours()
{
    static const std::vector<Misbehaviour> rows = ReadTable();
    return rows;
}
Misbehaviour FindMisbehaviour(const std::string& name)
{
    const std::size_t colon = name.find(':');
    const std::vector<Misbehaviour>& rows = ListMisbehaviours();
    const auto found = std::find_if(rows.begin(), rows.end(), [&](const Misbehaviour& row) {
        return row.name == name.substr(0, colon);
    });
    if (found == rows.end()) {
        throw std::invalid_argument("there is no misbehaviour " + name);
    }
    Misbehaviour row = *found;
    if (colon != std::string::npos) {
        row.parameter = ReadParameter(row, name.substr(colon + 1));
    }
    return row;
}

} // namespace DevSts
