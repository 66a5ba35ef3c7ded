#pragma once

#include "devsts/misbehaviour/Channel.h"
#include "devsts/misbehaviour/Misbehaviour.h"
#include "devsts/wire/Messages.h"

#include <functional>
#include <map>
#include <optional>

namespace DevSts {

/** What a script needs of its server. */
struct ScriptHost
{
    /** Makes the honest reply to a request. */
    std::function<Reply(const ReceivedRequest&)> answer;

    /** Called when all has been said that does not wait for the client. */
    std::function<void()> onQuiet;
};

/**
 * Does the acts of a misbehaviour on one connection. The acts, and what they take:
 *
 *   read              reads a request
 *   write TEXT N      writes a text N times, once without a number
 *   endless TEXT      writes a text as long as the client takes it
 *   drip TEXT N       writes an octet of the text every N milliseconds
 *   octets HEX        writes octets that are no text
 *   cut TEXT          writes as many octets of the text as the parameter says, never all of them
 *   wait N            does nothing for N milliseconds
 *   silence           does nothing until the client has gone
 *   listen N          reads octets N times, which need not be a request
 *   renegotiate, updateKeys N, tickets N   of TLS
 *   again             begins anew
 *   vanish            ends without TLS's own end
 *   reset             ends with a reset of the connection
 *
 * At the end of the acts the connection ends as it should. In a text, {reply} stands for the honest
 * reply to the latest request, {head} and {body} for its parts, {length} for the length of its
 * body, and {leg} for a leg of a negotiation.
 */
class Script
{
public:
    /** @param secure  the channel again, if it is one of TLS. */
    Script(
        Channel& channel,
        SecureChannel* secure,
        const ScriptHost& host,
        std::optional<long> parameter);

    void Run(const std::vector<Act>& acts);

private:
    using Doer = std::function<bool(Script&, const Act&)>;

    static const std::map<std::string, Doer>& GetActs();
    bool Do(const Act& act);
    bool ReadRequest();
    bool Listen(long times);
    bool Write(const std::string& text, long times);
    bool WriteEndlessly(const std::string& text);
    bool Drip(const std::string& text, long milliseconds);
    bool Cut(std::string text);
    bool StaySilent();
    bool Repeat(bool (SecureChannel::*act)(), long times);
    bool Vanish();
    bool Reset();
    std::string Fill(std::string text);
    std::string GetHead();
    const std::string& GetBody();

    Channel& _channel;
    SecureChannel* const _secure;
    const ScriptHost& _host;
    const std::optional<long> _parameter;
    std::string _received; ///< and not read as a request yet
    ReceivedRequest _request;
    std::optional<Reply> _reply; ///< to it
    bool _hasRead = false;
    bool _hasEnded = false;
};

} // namespace DevSts
