#pragma once

#include "ssoClient/assertion/reading.h"

/** The subject of an assertion and how it is confirmed [SAML-CORE 2.4]. */
namespace SsoClient::GeneralReader {

/** An element of type NameIDType [SAML-CORE 2.2.2]. */
AssertionNameId ReadNameId(const ReaderContext& context, const ElementNode& element);

/** Fills `subject` and `confirmations`. */
void ReadSubject(const ReaderContext& context, const ElementNode& element, AssertionFacts& facts);

} // namespace SsoClient::GeneralReader
