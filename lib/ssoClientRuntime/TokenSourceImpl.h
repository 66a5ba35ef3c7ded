#pragma once

#include "ssoClientRuntime/TokenKeeper.h"

#include <memory>
#include <utility>

namespace SsoClient {

/** What users hold of a source. It ends the keeper, which queued work may keep alive for longer. */
class TokenSourceImpl final : public TokenSource
{
public:
    TokenSourceImpl(TokenWays ways, const TokenSourceOptions& options)
        : _keeper(std::make_shared<TokenKeeper>(std::move(ways), options))
    {}
    TokenSourceImpl(const TokenSourceImpl&) = delete;
    TokenSourceImpl& operator=(const TokenSourceImpl&) = delete;
    ~TokenSourceImpl() { _keeper->Close(); }

    boost::shared_ptr<const SamlToken> GetToken() override { return _keeper->GetToken(); }
    boost::shared_ptr<const SamlToken> GetToken(
        std::chrono::steady_clock::time_point deadline) override
    {
        return _keeper->GetToken(deadline);
    }
    void GetTokenAsync(const TokenCompletion& completion) override
    {
        _keeper->GetTokenAsync(completion);
    }
    void Invalidate(const std::string& tokenId) override { _keeper->Invalidate(tokenId); }
    void Refresh() override { _keeper->Refresh(); }
    TokenSourceStatus GetStatus() const override { return _keeper->GetStatus(); }

private:
    const std::shared_ptr<TokenKeeper> _keeper;
};

} // namespace SsoClient
