#include "ssoClient/TokenSpec.h"

namespace SsoClient {

TokenSpec::TokenSpec(const TokenSpec& other) = default;

TokenSpec::~TokenSpec() = default;

} // namespace SsoClient
