#include "ssoClient/OperationObserver.h"

namespace SsoClient {

void OperationObserver::OnBegin(const ObservedOperation& /*operation*/) noexcept {}

void OperationObserver::OnExchange(
    const ObservedOperation& /*operation*/, const Quillon::Http::ExchangeFacts& /*facts*/) noexcept
{}

void OperationObserver::OnFault(
    const ObservedOperation& /*operation*/, const SoapFault& /*fault*/) noexcept
{}

void OperationObserver::OnEnd(
    const ObservedOperation& /*operation*/, const OperationOutcome& /*outcome*/) noexcept
{}

void OperationObserver::OnRefreshBegin(const ObservedRefresh& /*refresh*/) noexcept {}

void OperationObserver::OnRefreshEnd(
    const ObservedRefresh& /*refresh*/, const OperationOutcome& /*outcome*/) noexcept
{}

void OperationObserver::OnCacheHit(const ObservedCache& /*cache*/) noexcept {}
void OperationObserver::OnCacheMiss(const ObservedCache& /*cache*/) noexcept {}

} // namespace SsoClient
