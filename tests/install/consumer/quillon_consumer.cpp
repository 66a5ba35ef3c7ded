#include "quillon/StringUtil.h"

#include <iostream>

int main()
{
    std::cout << Quillon::StringUtil::Base64Encode("installed", 9) << "\n";
}
