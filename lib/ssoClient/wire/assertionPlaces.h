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

inline constexpr char HttpsClient[] = "lib/ssoClient/HttpsClient";
inline constexpr int NeitherErrorNorResponse = 116;

inline constexpr char ResponseHandlerImpl[] = "lib/ssoClient/ResponseHandlerImpl";
inline constexpr int DocumentWithoutRoot = 93;

inline constexpr char SamlTokenImpl[] = "lib/ssoClient/SamlTokenImpl";
inline constexpr int TokenWithoutSubject = 158;

inline constexpr char XmlReading[] = "lib/ssoClient/xmlReading";
inline constexpr int NoMissingAttribute = 65;

inline constexpr char XmlCommonBuilders[] = "lib/ssoClient/xmlCommonBuilders";
inline constexpr int CompositeWithoutRoot = 168;

inline constexpr char XmlRequestBuilders[] = "lib/ssoClient/xmlRequestBuilders";
inline constexpr int UnknownConfirmationType = 379;
inline constexpr int RenewalOfBearerToken = 513;

inline constexpr char XmlSoapBuilders[] = "lib/ssoClient/xmlSoapBuilders";
inline constexpr int EnvelopeWithoutBody = 169;
inline constexpr int EnvelopeWithoutHeader = 173;
inline constexpr int HeaderWithoutSecurity = 177;
inline constexpr int SignedEnvelopeWithoutHeader = 339;
inline constexpr int CertRefSignedEnvelopeWithoutHeader = 376;

} // namespace SsoClient::AssertionPlaces
