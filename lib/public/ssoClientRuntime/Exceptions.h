#pragma once

#include "quillon/system/DateTime.h"
#include "ssoClient/Exceptions.h"
#include "ssoClientRuntime/Export.h"

#include <memory>
#include <optional>
#include <string>

namespace SsoClient {

/** Why a source has no token at the moment. */
struct TokenOutage
{
    /** What the last attempt failed with, as it was thrown; null if none has failed yet. */
    std::shared_ptr<const Quillon::Exception> reason;

    /** When the first of the failures in a row was; absent if there is none. */
    std::optional<Quillon::System::DateTime> since;

    /** When the source tries again; absent while an attempt is under way, or after the end. */
    std::optional<Quillon::System::DateTime> nextAttempt;
};

/**
 * A source has no token that may be handed out. The text has the class and the first 500 bytes of
 * the reason's text; `GetOutage` has the reason itself, which `Throw` raises again as what it is.
 *
 * Thread safety: immutable.
 */
class SSOCLIENT_RUNTIME_API NoTokenException
    : public Quillon::ExceptionOf<NoTokenException, SsoException>
{
public:
    explicit NoTokenException(const TokenOutage& outage);
    ~NoTokenException() override;

    const TokenOutage& GetOutage() const noexcept { return _outage; }

private:
    TokenOutage _outage;
};

} // namespace SsoClient
