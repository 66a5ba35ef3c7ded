#include "TestData.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

namespace Benchmarks {

std::string ReadFile(const std::string& name)
{
    std::ifstream file(std::string(TEST_DATA_DIR) + "/" + name, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    if (!file || text.str().empty()) {
        throw std::runtime_error("Cannot read " + name);
    }
    return text.str();
}

} // namespace Benchmarks
