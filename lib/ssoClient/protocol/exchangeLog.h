#pragma once

#include "quillon/http/ExchangeFacts.h"

#include <string>

/**
 * The logger "SsoClient.Exchange", which tells at trace level what was exchanged. It is another one
 * than that of the operations, so that who reads their lines meets none in between.
 */
namespace SsoClient {

/** Whether its lines are written. */
bool LogsExchanges();

/** Writes how an exchange went: one line, and another about TLS. */
void LogExchange(const Quillon::Http::ExchangeFacts& facts);

/** Writes the code and the text of a SOAP fault, cut where they are long. */
void LogFault(const std::string& code, const std::string& text);

/**
 * Writes that a token which is refused would be read as a general assertion.
 *
 * @param nameFormat  of its subject's name identifier; empty if there is none.
 */
void LogGeneralToken(const std::string& nameFormat);

} // namespace SsoClient
