#pragma once

/**
 * Where violated invariants are said to be. Operators search logs for these texts, `unit:number`,
 * so they are names and no positions: they stay when a source is renamed, split or edited.
 */
namespace SsoClient::AssertionPlaces {

inline constexpr char PrincipalId[] = "lib/public/ssoClient/PrincipalId";
inline constexpr int PrincipalWithoutName = 43;
inline constexpr int PrincipalWithoutDomain = 44;

inline constexpr char RequestBuilderImpl[] = "lib/ssoClient/RequestBuilderImpl";
inline constexpr int SigningWithoutIdentity = 214;

inline constexpr char SecurityTokenServiceImpl[] = "lib/ssoClient/SecurityTokenServiceImpl";
inline constexpr int NullArgumentOfAsyncOperation = 488;
inline constexpr int EmptyFirstLeg = 762;
inline constexpr int EmptyFurtherLeg = 794;

} // namespace SsoClient::AssertionPlaces
