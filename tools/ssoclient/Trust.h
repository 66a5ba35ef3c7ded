#pragma once

#include "CommandLine.h"

#include "quillon/crypto/Certificate.h"

#include <list>
#include <string>
#include <vector>

using CertificateList = std::list<Quillon::Ref<const Quillon::Crypto::Certificate>>;

/** Adds `--trust PEM...`. */
Option AddTrustTo(const Command& command, std::vector<std::string>& trustFiles);

/**
 * Reads all certificates of the PEM files.
 *
 * @throws UsageError  a file cannot be read, or holds no certificate or one that is broken.
 */
CertificateList ReadCertificates(const std::vector<std::string>& files);
