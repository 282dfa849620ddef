#include <OrvanCore/String.h>

#include <gtest/gtest.h>

using Orvan::String;

TEST(String, TreatsNullAsTheEmptyString)
{
    char const* const null = nullptr;
    String text(null);
    EXPECT_STREQ(text.c_str(), "");
    EXPECT_TRUE(text.empty() && text == null && String() == "" && !(String("x") == null));
    text += null;
    text = "x";
    text += null;
    EXPECT_TRUE(text == "x");
    text = null;
    EXPECT_EQ(text, String());
}

TEST(String, CopiesAppendsAndCompares)
{
    for (std::string const& plain : {std::string("short"), std::string(100, 'l')}) {
        String const text(plain.c_str());
        String copy = text;
        copy += "!";
        EXPECT_STREQ(text.c_str(), plain.c_str()) << "a copy is independent";
        EXPECT_STREQ(copy.c_str(), (plain + "!").c_str());
        EXPECT_TRUE(copy != text && text < copy && copy == (plain + "!").c_str());

        copy += copy.c_str(); // from itself
        EXPECT_EQ(copy.view(), plain + "!" + plain + "!");
        copy = copy.c_str() + plain.size() + 1;
        EXPECT_EQ(copy.view(), plain + "!");

        String const moved = std::move(copy);
        copy = text;
        EXPECT_EQ(moved.view(), plain + "!");
        EXPECT_EQ(copy, text);
    }
}
