#pragma once

#include "quillon/crypto/Certificate.h"
#include "quillon/crypto/PrivateKey.h"

#include <fstream>
#include <iterator>
#include <list>
#include <stdexcept>
#include <string>

/** A file of the test data, as it is. */
inline std::string ReadTestData(const std::string& name)
{
    std::ifstream file(std::string(TEST_DATA_DIR) + "/" + name, std::ios::binary);
    if (!file) {
        throw std::runtime_error("No test data " + name);
    }
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

inline std::list<Quillon::Ref<const Quillon::Crypto::Certificate>> GetTestCertificates(
    const std::string& name)
{
    return Quillon::Crypto::ParsePemCertificates(ReadTestData("keys/" + name + "-cert.pem"));
}

inline Quillon::Ref<const Quillon::Crypto::PrivateKey> GetTestKey(const std::string& name)
{
    return Quillon::Crypto::CreatePrivateKey(ReadTestData("keys/" + name + "-key.pem"));
}
