#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/system/DateTime.h"
#include "ssoClient/message/xmlCommonBuilders.h"
#include "ssoClient/wire/wireNames.h"

#include <string>
#include <vector>

/**
 * The elements of a WS-Security header. Each declares the namespaces that it uses, except where
 * its comment says so.
 */
namespace SsoClient {

/** The text form of times in requests: `2011-07-05T09:03:07.042Z`, always with milliseconds. */
std::string DateTimeFormatter(const Quillon::System::DateTime& time);

/**
 * The instant `minutes` after `time`. The microseconds are counted in 32 bits: the result is
 * exact from -35 to 35 minutes and wraps beyond.
 */
Quillon::System::DateTime AddMinutesToDate(const Quillon::System::DateTime& time, int minutes);

/** `wsu:Created` and `wsu:Expires`, for an element that declares `wsu`. */
std::vector<XMLBuilderPtr> WssuCreatedAndExpiresBuilders(
    const Quillon::System::DateTime& created, const Quillon::System::DateTime& expires);

/** `wsu:Timestamp` from the moment of this call, valid for `validityMinutes`. */
XMLBuilderPtr WssuTimestampBuilder(int validityMinutes);

/** `wsse:Security` with a timestamp. */
XMLBuilderPtr WsSecurityHeaderBuilder(int validityMinutes);

/** `wsse:UsernameToken` without a password. */
XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName);

/** `wsse:UsernameToken` with the password in clear [UsernameToken Profile 1.0, 3.1]. */
XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName, const std::string& password);

/**
 * `wsse:BinarySecurityToken` with the certificate in DER.  It does not declare `wsse`: it belongs
 * into the security header.
 *
 * @param certificate  never null.
 */
XMLBuilderPtr WsseX509v3BinarySecTokenBuilder(
    const std::string& id, const Quillon::Crypto::Certificate* certificate);

/** `wsse:SecurityTokenReference` to the binary security token of that id. */
XMLBuilderPtr WsseX509v3BSTReferenceBuilder(const std::string& id);

/**
 * `wsse:SecurityTokenReference` to the SAML assertion of that ID.
 *
 * @param tokenType  what the reference says that it leads to; the profile's name has two spellings.
 */
XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(
    const std::string& assertionId, const char* tokenType = Wire::Saml20TokenType);

/** `ds:KeyInfo` with the certificate in DER. @param certificate  never null. */
XMLBuilderPtr DsCertificateKeyInfoBuilder(const Quillon::Crypto::Certificate* certificate);

} // namespace SsoClient
