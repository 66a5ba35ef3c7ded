// Usage: inspect_file TOKEN_XML STS_PEM
#include "ssoClient/CreateSamlToken.h"
#include "ssoClient/Descriptions.h"

#include <fstream>
#include <iostream>
#include <iterator>

static std::string ReadFile(const char* file)
{
    std::ifstream stream(file);
    return std::string(std::istreambuf_iterator(stream), {});
}

int main(int argc, char** argv)
try {
    if (argc != 3) {
        return 2;
    }
    const auto trusted = Quillon::Crypto::LoadPemCertificates(argv[2]);
    const auto token = SsoClient::CreateSamlToken(ReadFile(argv[1]), trusted);
    std::cout << SsoClient::CreateRedactedDescription(*token) << "\n";
} catch (const Quillon::Exception& error) {
    std::cerr << Quillon::GetClassName(error) << ": " << error.what() << "\n";
    return 1;
}
