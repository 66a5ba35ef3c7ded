#pragma once

#include "ssoClient/NegotiationHandler.h"

#include <boost/smart_ptr/make_shared.hpp>

#include <deque>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

inline SsoClient::Leg ToLeg(const std::string& text)
{
    return {text.begin(), text.end()};
}

/** A handler that answers with the next of `answers` and remembers what it was asked. */
class ScriptedHandler final : public SsoClient::NegotiationHandler
{
public:
    explicit ScriptedHandler(std::deque<std::string> texts)
    {
        for (const std::string& text : texts) {
            answers.push_back(boost::make_shared<SsoClient::Leg>(ToLeg(text)));
        }
    }

    boost::shared_ptr<SsoClient::Leg> Negotiate(const SsoClient::Leg& serverLeg) override
    {
        asked.emplace_back(serverLeg.begin(), serverLeg.end());
        if (answers.empty()) {
            throw std::runtime_error("asked too often");
        }
        boost::shared_ptr<SsoClient::Leg> answer = std::move(answers.front());
        answers.pop_front();
        return answer;
    }

    std::deque<boost::shared_ptr<SsoClient::Leg>> answers;
    std::vector<std::string> asked;
};

/** A reply with the parts that are not empty; `leg` is Base64, `assertion` XML. */
inline std::string NegotiationReply(
    const std::string& contextId, const std::string& leg, const std::string& assertion)
{
    return "<S:Envelope xmlns:S=\"http://schemas.xmlsoap.org/soap/envelope/\"><S:Body>"
           "<t:RequestSecurityTokenResponse"
           " xmlns:t=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\" Context=\""
           + contextId + "\">"
           + (leg.empty() ? "" : "<t:BinaryExchange>" + leg + "</t:BinaryExchange>")
           + (assertion.empty() ? ""
                                : "<t:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</t:TokenType>"
                                  "<t:RequestedSecurityToken>"
                                      + assertion + "</t:RequestedSecurityToken>")
           + "</t:RequestSecurityTokenResponse></S:Body></S:Envelope>";
}
