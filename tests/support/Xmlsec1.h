#pragma once

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>
#include <unistd.h>

inline constexpr char RequestSignature[] = "//*[@Id=\"holderOfKeyProofSignature\"]";
inline constexpr char AssertionSignature[] =
    "//*[local-name()=\"Assertion\"]/*[local-name()=\"Signature\"]";

/**
 * Whether the xmlsec1 tool verifies the signature that `xpath` selects in `xml`, with the key of
 * the test data's certificate `certificateName`.
 */
inline bool Xmlsec1Verifies(
    const std::string& xml, const std::string& certificateName, const std::string& xpath)
{
    const std::string file = testing::TempDir() + "xmlsec1-" + std::to_string(getpid()) + ".xml";
    std::ofstream(file, std::ios::binary) << xml;
    const std::string command =
        "xmlsec1 --verify --pubkey-cert-pem '" TEST_DATA_DIR "/keys/" + certificateName
        + "-cert.pem' --id-attr:Id Body --id-attr:Id Timestamp --id-attr:ID Assertion"
          " --id-attr:Id Action --id-attr:Id MessageID --id-attr:Id ReplyTo --id-attr:Id To"
          " --node-xpath '"
        + xpath + "' '" + file + "' >/dev/null 2>&1";
    const int status = std::system(command.c_str());
    std::remove(file.c_str());
    return status == 0;
}
