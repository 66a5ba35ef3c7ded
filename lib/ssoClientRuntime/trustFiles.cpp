#include "ssoClientRuntime/trustFiles.h"

#include "quillon/crypto/PublicKey.h"

#include <algorithm>
#include <filesystem>
#include <set>
#include <system_error>
#include <vector>

namespace SsoClient {

namespace {

namespace fs = std::filesystem;
using Quillon::Crypto::CryptoException;

bool IsCertificateFile(const fs::path& path)
{
    const std::string extension = path.extension().string();
    return extension == ".pem" || extension == ".crt" || extension == ".cer";
}

std::vector<std::string> ListFiles(const std::string& folder)
{
    std::vector<std::string> files;
    std::error_code error;
    for (fs::directory_iterator entry(folder, error); !error && entry != fs::directory_iterator();
         entry.increment(error)) {
        if (IsCertificateFile(entry->path())) {
            files.push_back(entry->path().string());
        }
    }
    if (error) {
        throw CryptoException("Cannot take certificates from '" + folder + "': " + error.message());
    }
    if (files.empty()) {
        throw CryptoException(
            "Cannot take certificates from '" + folder
            + "': the folder has no file *.pem, *.crt or *.cer");
    }
    std::sort(files.begin(), files.end());
    return files;
}

} // namespace

TrustStore::Certificates ReadTrustFiles(const std::string& path)
{
    std::error_code none;
    const std::vector<std::string> files =
        fs::is_directory(path, none) ? ListFiles(path) : std::vector<std::string>{path};
    TrustStore::Certificates certificates;
    for (const std::string& file : files) {
        certificates.splice(certificates.end(), Quillon::Crypto::LoadPemCertificates(file));
    }
    std::set<std::string> known; // fingerprints
    certificates.remove_if([&known](const auto& certificate) {
        return !known.insert(certificate->GetFingerprint()).second;
    });
    return certificates;
}

} // namespace SsoClient
