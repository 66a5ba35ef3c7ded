#include "TokenTable.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <ostream>
#include <sstream>
#include <stdexcept>

namespace HostileTests {

namespace {

using Json = nlohmann::json;

const std::string Tokens = TEST_DATA_DIR "/tokens/";

std::string ReadFile(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        throw std::runtime_error("cannot read " + path);
    }
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

Quillon::Ref<const Quillon::Crypto::Certificate> LoadCertificate(const std::string& name)
{
    const std::string pem = ReadFile(TEST_DATA_DIR "/keys/" + name + "-cert.pem");
    return Quillon::Crypto::ParsePemCertificates(pem).front();
}

std::string QuotePair(const Json& pair)
{
    return Quote(pair[0].get<std::string>()) + " in " + Quote(pair[1].get<std::string>());
}

void DescribeAttribute(const Json& attribute, std::ostream& out)
{
    out << "  " << Quote(attribute[0].get<std::string>()) << ":";
    for (const Json& value : attribute[1]) {
        out << " " << Quote(value.get<std::string>());
    }
    out << "\n";
}

void DescribeAdvice(const Json& facts, std::ostream& out)
{
    for (const Json& advice : facts.at("advice")) {
        out << "advice: " << Quote(advice.at("source").get<std::string>()) << "\n";
        for (const Json& attribute : advice.at("attributes")) {
            DescribeAttribute(attribute, out);
        }
    }
}

void DescribeLists(const Json& facts, std::ostream& out)
{
    for (const Json& group : facts.at("groups")) {
        out << "group: " << QuotePair(group) << "\n";
    }
    for (const Json& delegate : facts.at("delegationChain")) {
        out << "delegate: " << QuotePair(delegate) << " at " << delegate[2].get<long long>()
            << "\n";
    }
    for (const Json& name : facts.at("audience")) {
        out << "audience: " << Quote(name.get<std::string>()) << "\n";
    }
}

std::string DescribeFacts(const Json& facts)
{
    const bool holderOfKey = facts.at("confirmation") == "holder-of-key";
    std::ostringstream out;
    out << "id: " << Quote(facts.at("id").get<std::string>()) << "\n"
        << "subject: " << QuotePair(facts.at("subject")) << "\n"
        << "name: " << Quote(facts.at("fullName")[0].get<std::string>()) << " "
        << Quote(facts.at("fullName")[1].get<std::string>()) << "\n"
        << "valid: " << facts.at("startMicros").get<long long>() << " to "
        << facts.at("endMicros").get<long long>() << "\n"
        << "renewable " << facts.at("renewable").get<bool>() << ", delegable "
        << facts.at("delegable").get<bool>() << ", solution " << facts.at("solution").get<bool>()
        << ", confirmation " << (holderOfKey ? 1 : 0) << "\n";
    if (holderOfKey) {
        const auto certificate = LoadCertificate(facts.at("certificate").get<std::string>());
        out << "certificate: " << certificate->GetFingerprint() << "\n";
    }
    DescribeLists(facts, out);
    DescribeAdvice(facts, out);
    return out.str();
}

TokenCase ToTokenCase(const std::string& folder, const std::string& rule, const Json& line)
{
    TokenCase tokenCase;
    tokenCase.file = folder + "/" + line.at("file").get<std::string>();
    tokenCase.rule = rule;
    tokenCase.about = line.value("about", "");
    line.at("trust").get_to(tokenCase.trusted);
    line.at("nowMicros").get_to(tokenCase.nowMicros);
    line.at("toleranceSec").get_to(tokenCase.toleranceSec);
    if (line.contains("facts")) {
        tokenCase.facts = DescribeFacts(line.at("facts"));
        return tokenCase;
    }
    for (const Json& refusal : line.at("refusals")) {
        tokenCase.refusals.push_back(
            {refusal.at("class").get<std::string>(),
             refusal.value("message", ""),
             refusal.value("prefix", ""),
             refusal.value("contains", "")});
    }
    return tokenCase;
}

/** Adds the lines of the table in `folder`, which is relative to the folder of tokens. */
void LoadTable(const std::string& folder, const Json& defaults, std::vector<TokenCase>& cases)
{
    const Json table = Json::parse(ReadFile(Tokens + folder + "/expected.json"));
    for (const Json& token : table.at("tokens")) {
        Json line = defaults;
        line.update(token);
        cases.push_back(ToTokenCase(folder, table.value("rule", ""), line));
    }
}

std::vector<TokenCase> LoadTokenTable()
{
    const Json defaults = Json::parse(ReadFile(Tokens + "defaults.json"));
    std::vector<TokenCase> cases;
    LoadTable("accepted", defaults, cases);
    for (const auto& rule : std::filesystem::directory_iterator(Tokens + "refused")) {
        LoadTable("refused/" + rule.path().filename().string(), defaults, cases);
    }
    return cases;
}

} // namespace

std::ostream& operator<<(std::ostream& out, const TokenCase& tokenCase)
{
    return out << tokenCase.file;
}

const std::vector<TokenCase>& GetTokenTable()
{
    static const std::vector<TokenCase> table = LoadTokenTable();
    return table;
}

const TokenCase& GetTokenCase(const std::string& file)
{
    const std::vector<TokenCase>& table = GetTokenTable();
    const auto found = std::find_if(
        table.begin(), table.end(), [&file](const TokenCase& line) { return line.file == file; });
    if (found == table.end()) {
        throw std::runtime_error("the table has no " + file);
    }
    return *found;
}

std::string ReadToken(const TokenCase& tokenCase)
{
    return ReadFile(Tokens + tokenCase.file);
}

Conditions GetConditions(const TokenCase& tokenCase)
{
    Conditions conditions;
    for (const std::string& name : tokenCase.trusted) {
        conditions.trusted.push_back(LoadCertificate(name));
    }
    conditions.nowMicros = tokenCase.nowMicros;
    conditions.toleranceSec = tokenCase.toleranceSec;
    return conditions;
}

std::string ReplaceOnce(const std::string& text, const std::string& from, const std::string& to)
{
    const std::size_t position = text.find(from);
    if (position == std::string::npos || text.find(from, position + 1) != std::string::npos) {
        throw std::runtime_error(from + " does not stand once in the text");
    }
    return std::string(text).replace(position, from.size(), to);
}

} // namespace HostileTests
