#include "devsts/misbehaviour/Script.h"

#include "devsts/wire/ReplyWriter.h"

#include <algorithm>
#include <map>
#include <stdexcept>
#include <utility>

namespace DevSts {

namespace {

constexpr const char* EndOfHead = "\r\n\r\n";

std::string FromHex(const std::string& text)
{
    constexpr int Base = 16;
    std::string octets;
    for (std::size_t at = 0; at + 1 < text.size(); at += 2) {
        octets += static_cast<char>(std::stoi(text.substr(at, 2), nullptr, Base));
    }
    return octets;
}

std::string Trim(const std::string& text)
{
    const std::size_t first = text.find_first_not_of(' ');
    return first == std::string::npos ? "" : text.substr(first);
}

/** The next line of `text` from `at` on, which it moves behind it. */
std::string TakeLine(const std::string& text, std::size_t& at)
{
    const std::size_t end = std::min(text.find("\r\n", at), text.size());
    std::string line = text.substr(at, end - at);
    at = std::min(end + 2, text.size());
    return line;
}

ReceivedRequest ParseHead(const std::string& head)
{
    ReceivedRequest request;
    std::size_t at = 0;
    const std::string first = TakeLine(head, at);
    const std::size_t blank = std::min(first.find(' '), first.size());
    request.method = first.substr(0, blank);
    while (at < head.size()) {
        const std::string line = TakeLine(head, at);
        const std::size_t colon = std::min(line.find(':'), line.size());
        request.headers.emplace(
            line.substr(0, colon), Trim(line.substr(std::min(colon + 1, line.size()))));
    }
    return request;
}

std::size_t GetLength(const ReceivedRequest& request)
{
    const auto length = request.headers.find("Content-Length");
    return length == request.headers.end() ? 0 : std::stoul(length->second);
}

/** A leg that any mechanism may have sent; the context is the service's to choose. */
std::string MakeLeg()
{
    return WriteLegReply({"misbehaving", "leg"});
}

} // namespace

Script::Script(
    Channel& channel, SecureChannel* secure, const ScriptHost& host, std::optional<long> parameter)
    : _channel(channel)
    , _secure(secure)
    , _host(host)
    , _parameter(parameter)
{}

void Script::Run(const std::vector<Act>& acts)
{
    auto next = acts.begin();
    while (next != acts.end() && Do(*next)) {
        ++next;
        if (next != acts.end() && next->name == "again") {
            next = acts.begin();
        }
    }
    if (!_hasEnded) {
        _channel.End();
    }
    _host.onQuiet();
    _channel.Drain();
}

const std::map<std::string, Script::Doer>& Script::GetActs()
{
    static const std::map<std::string, Doer> acts = {
        {"read", [](Script& self, const Act&) { return self.ReadRequest(); }},
        {"listen", [](Script& self, const Act& act) { return self.Listen(act.number); }},
        {"write",
         [](Script& self, const Act& act) { return self.Write(self.Fill(act.text), act.number); }},
        {"octets",
         [](Script& self, const Act& act) { return self.Write(FromHex(act.text), act.number); }},
        {"endless", [](Script& self, const Act& act) { return self.WriteEndlessly(act.text); }},
        {"drip",
         [](Script& self, const Act& act) { return self.Drip(self.Fill(act.text), act.number); }},
        {"cut", [](Script& self, const Act& act) { return self.Cut(self.Fill(act.text)); }},
        {"wait", [](Script& self, const Act& act) { return self._channel.Pause(act.number); }},
        {"silence", [](Script& self, const Act&) { return self.StaySilent(); }},
        {"renegotiate",
         [](Script& self, const Act& act) {
             return self.Repeat(&SecureChannel::Renegotiate, act.number);
         }},
        {"updateKeys",
         [](Script& self, const Act& act) {
             return self.Repeat(&SecureChannel::UpdateKeys, act.number);
         }},
        {"tickets",
         [](Script& self, const Act& act) {
             return self.Repeat(&SecureChannel::SendTicket, act.number);
         }},
        {"vanish", [](Script& self, const Act&) { return self.Vanish(); }},
        {"reset", [](Script& self, const Act&) { return self.Reset(); }},
    };
    return acts;
}

/** @return whether to go on. */
bool Script::Do(const Act& act)
{
    return GetActs().at(act.name)(*this, act);
}

bool Script::ReadRequest()
{
    if (std::exchange(_hasRead, true)) {
        _host.onQuiet();
    }
    while (_received.find(EndOfHead) == std::string::npos) {
        if (!_channel.Read(_received)) {
            return false;
        }
    }
    const std::size_t head = _received.find(EndOfHead);
    _request = ParseHead(_received.substr(0, head));
    const std::size_t end = head + std::string(EndOfHead).size() + GetLength(_request);
    while (_received.size() < end) {
        if (!_channel.Read(_received)) {
            return false;
        }
    }
    _request.body = _received.substr(end - GetLength(_request), GetLength(_request));
    _received.erase(0, end);
    _reply.reset();
    return true;
}

bool Script::Listen(long times)
{
    for (long count = 0; count < times; ++count) {
        if (!_channel.Read(_received)) {
            return false;
        }
    }
    return true;
}

bool Script::Write(const std::string& text, long times)
{
    for (long count = 0; count < times; ++count) {
        if (!_channel.Write(text)) {
            return false;
        }
    }
    return true;
}

/** In large pieces, so that a limit is reached soon. */
bool Script::WriteEndlessly(const std::string& text)
{
    constexpr std::size_t Size = 32768;
    std::string piece = text;
    while (piece.size() < Size) {
        piece += text;
    }
    while (_channel.Write(piece)) {
    }
    return false;
}

bool Script::Drip(const std::string& text, long milliseconds)
{
    for (const char octet : text) {
        if (!_channel.Write(std::string(1, octet)) || !_channel.Pause(milliseconds)) {
            return false;
        }
    }
    return true;
}

bool Script::Cut(std::string text)
{
    const auto most = static_cast<long>(text.size()) - 1;
    text.resize(static_cast<std::size_t>(std::min(_parameter.value_or(0), most)));
    return text.empty() || _channel.Write(text);
}

bool Script::StaySilent()
{
    _host.onQuiet();
    while (_channel.Read(_received)) {
        _received.clear();
    }
    return false;
}

bool Script::Repeat(bool (SecureChannel::*act)(), long times)
{
    for (long count = 0; _secure != nullptr && count < times; ++count) {
        if (!(_secure->*act)()) {
            return false;
        }
    }
    return true;
}

bool Script::Vanish()
{
    _channel.Vanish();
    _hasEnded = true;
    return false;
}

bool Script::Reset()
{
    _channel.Reset();
    _hasEnded = true;
    return false;
}

std::string Script::Fill(std::string text)
{
    static const std::map<std::string, std::function<std::string(Script&)>> fillings = {
        {"{reply}", [](Script& self) { return self.GetHead() + self.GetBody(); }},
        {"{head}", [](Script& self) { return self.GetHead(); }},
        {"{body}", [](Script& self) { return self.GetBody(); }},
        {"{length}", [](Script& self) { return std::to_string(self.GetBody().size()); }},
        {"{leg}", [](Script&) { return MakeLeg(); }},
        {"{legLength}", [](Script&) { return std::to_string(MakeLeg().size()); }},
    };
    for (const auto& [name, fill] : fillings) {
        for (std::size_t at = 0; (at = text.find(name, at)) != std::string::npos;) {
            const std::string filling = fill(*this);
            text.replace(at, name.size(), filling);
            at += filling.size();
        }
    }
    return text;
}

std::string Script::GetHead()
{
    const std::string length = std::to_string(GetBody().size());
    constexpr int StatusFault = 500;
    const char* const status =
        _reply->status == StatusFault ? "500 Internal Server Error" : "200 OK";
    return std::string("HTTP/1.1 ") + status + "\r\nContent-Type: text/xml"
           + "\r\nContent-Length: " + length + EndOfHead;
}

const std::string& Script::GetBody()
{
    if (!_reply) {
        _reply = _host.answer(_request);
    }
    return _reply->body;
}

} // namespace DevSts
