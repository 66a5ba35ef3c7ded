#include "ssoClient/wire/WipedText.h"

#include <gtest/gtest.h>

#include <new>
#include <string_view>

using SsoClient::WipedText;

TEST(WipedText, HoldsACopy)
{
    std::string original = "a secret that is too long to stand in the string itself";
    const WipedText copy(original);
    EXPECT_EQ(copy.text, original);
    EXPECT_NE(copy.text.data(), original.data());
}

TEST(WipedText, OverwritesItWhenItGoes)
{
    // Placed by hand, so that the short text can be looked for inside the object afterwards.
    alignas(WipedText) unsigned char memory[sizeof(WipedText)];
    auto* const copy = new (memory) WipedText("secret");
    const std::string_view bytes(reinterpret_cast<const char*>(memory), sizeof memory);
    ASSERT_NE(std::string_view::npos, bytes.find("secret"));
    copy->~WipedText();
    EXPECT_EQ(std::string_view::npos, bytes.find("secret"));
}
