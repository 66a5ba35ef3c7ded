#pragma once

#include "devsts/wire/Xml.h"

#include <string>

namespace DevSts {

/**
 * Lets xmlsec1 verify a ds:Signature whose shape ReadSignature has admitted and whose referenced
 * elements RegisterId has made known. The key is the one given; KeyInfo is not looked at.
 *
 * @return false too if the certificate cannot be decoded or holds no RSA key.
 */
bool VerifySignature(xmlNode* signature, const std::string& certificateDer);

} // namespace DevSts
