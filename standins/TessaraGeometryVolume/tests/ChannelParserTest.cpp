#include <TessaraGeometryVolume/Canceller.h>
#include <TessaraGeometryVolume/ChannelParser.h>

#include <gtest/gtest.h>

#include <map>
#include <thread>

using TSR::Utils::ChannelParser;

namespace {

// The names that the list accepts, separated by spaces.
std::string accepted(char const* list, std::vector<char const*> const& names)
{
    ChannelParser parser;
    parser.parses(list);
    std::string result;
    for (char const* const name : names)
        if (parser.accepts(name))
            result += (result.empty() ? "" : " ") + std::string(name);
    return result;
}

}

TEST(ChannelParser, SelectsNames)
{
    std::vector<char const*> const names{"uv", "uv2", "UV", "weight", "weightTotal", "a-b", "gr\u00f6\u00dfe"};
    for (auto const& [list, expected] : std::map<std::string, std::string>{
             {"", ""}, {" ,\t\n, ", ""}, {"uv", "uv"}, {" uv,weight\tabsent\n", "uv weight"},
             {"*", "uv uv2 UV weight weightTotal a-b gr\u00f6\u00dfe"}, {"uv*", "uv uv2"}, {"uv?", "uv2"},
             {"??", "uv UV"}, {"gr??e", "gr\u00f6\u00dfe"}, {"*t*t*", "weightTotal"}, {"w**t", "weight"},
             {"*-*", "a-b"}, {"-uv", ""}, {"* -uv*", "UV weight weightTotal a-b gr\u00f6\u00dfe"},
             {"-uv* *", "uv uv2 UV weight weightTotal a-b gr\u00f6\u00dfe"}, // the last match decides
             {"weight* ^weight* weightTotal", "weightTotal"}, {"[uv]* \\* u.", ""}, // only * and ? are special
         })
        EXPECT_EQ(accepted(list.c_str(), names), expected) << list;
    EXPECT_FALSE(ChannelParser().accepts("uv"));
    EXPECT_FALSE(ChannelParser().accepts(""));
}

TEST(ChannelParser, ReportsTheFirstFaultAndKeepsTheOtherEntries)
{
    struct Case {
        char const *list, *fault, *accepted;
    };
    for (auto const& [list, fault, names] : std::vector<Case>{
             {"uv -weight", "", "uv"},
             {"* -", "\"-\" at character 3 of the list excludes nothing", "uv weight"},
             {"^ weight", "\"^\" at character 1 of the list excludes nothing", "weight"},
             {"uv,weight -^uv ^", "\"-^uv\" at character 11 of the list has two signs of exclusion", "uv weight"},
         }) {
        ChannelParser parser;
        parser.parses("*");
        ChannelParser::Status const status = parser.parses(list);
        EXPECT_EQ(static_cast<bool>(status), *fault == '\0') << list;
        EXPECT_STREQ(status.message().c_str(), fault);
        EXPECT_EQ(accepted(list, {"uv", "weight"}), names);
        EXPECT_FALSE(parser.accepts("absent") && *list != '*') << "a new list replaces the old one";
    }
}

TEST(ChannelParser, MatchesManyWildcardsWithoutBacktrackingExponentially)
{
    ChannelParser parser;
    parser.parses("*a*a*a*a*a*a*a*a*a*a*a*a*a*a*a*a*a*a*a*a*b"); // would run for years
    EXPECT_FALSE(parser.accepts(std::string(5000, 'a').c_str()));
    EXPECT_TRUE(parser.accepts((std::string(5000, 'a') + "b").c_str()));
}

TEST(Canceller, CountsCallsFromAllThreads)
{
    TSR::Canceller::resetCallCount();
    auto const call = [] {
        TSR::Canceller::ID place{4};
        for (int i = 0; i < 1000; ++i)
            TSR::Canceller::cancelID(place);
        EXPECT_EQ(place.value, 4u);
    };
    std::thread other(call);
    call();
    other.join();
    EXPECT_EQ(TSR::Canceller::callCount(), 2000u);
    TSR::Canceller::resetCallCount();
    EXPECT_EQ(TSR::Canceller::callCount(), 0u);
}
