#include "shell/CommandLine.h"

#include "program/RunProgram.h"
#include "program/TemporaryFolder.h"
#include "support/Random.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <iterator>
#include <regex>
#include <sstream>

namespace ModelingProgram {

namespace {

    using testing::HasSubstr;
    using TestSupport::Result, TestSupport::run;

    std::vector<std::string> wordsOf(std::string const& text)
    {
        std::istringstream stream(text);
        return {std::istream_iterator<std::string>(stream), {}};
    }

    std::vector<std::string> const kCommands = {"info", "validate", "convert", "add-points", "delete-points",
        "delete-faces", "merge", "triangulate", "subdivide", "make-volume", "smooth", "remove-slivers", "repair",
        "stitch", "run"};
    // They read no files.
    std::vector<std::string> const kHelpers = {"help", "completion", "man"};

}

TEST(CommandLine, SurvivesArbitraryArguments)
{
    // Files are in a folder that does not exist: nothing is ever read or written.
    std::vector<std::string> const words = {"", "", "no/a.obj", "no/b.ply", "no/c.vdb", "no/", "--json",
        "--json=", "-f", "--threads", "2", "-1", "-.5", "1e999", "nan", "--indices", "--box", "--attribute", "--invert",
        "--tag", "-o", "--output=", "--source-attribute", "--channels", "--channels=", "--amount", "--weights",
        "--pin-attribute", "--ratio", "--tolerance", "--relative", "--volume", "--grid", "--max-memory", "4GB", "9QB",
        "--distance-to", "--from", "--to", "--voxels", "--band", "--template", "--on", "--check", "--rotate", "--do",
        "smooth; merge", "--recipe", "--print-recipe", "--wrong", "-", "--", "--=", "-=", "---", "[]", "{}", "[a,b]",
        "%%", "=", "\"", "'", " ", "\n", "\xff", "info", "--help", "--version"};
    TestSupport::Random random(1);
    for (int i = 0; i != 2000; ++i) {
        std::vector<std::string> line;
        if (random.below(20) != 0)
            line.push_back(kCommands[random.below(kCommands.size())]);
        for (std::size_t count = random.below(12); count != 0; --count)
            line.insert(line.end(), 1 + random.below(9) / 8, words[random.below(words.size())]);
        Result const result = run(line);
        std::string const shown = testing::PrintToString(line);
        bool const hasEmpty = std::any_of(line.begin(), line.end(), [](std::string const& word) {
            return word.empty() || (word.starts_with("--") && word.find('=') == word.size() - 1);
        });
        EXPECT_EQ(hasEmpty, result.messages.find(" is empty\n") != std::string::npos) << shown << result.messages;
        EXPECT_THAT((std::array{0, 2, 3, 5}), testing::Contains(result.exitCode)) << shown << result.messages;
        EXPECT_EQ(result.exitCode != 0, result.messages.starts_with("modeling: ")) << shown << result.messages;
        ASSERT_FALSE(testing::Test::HasFailure());
    }
    EXPECT_FALSE(std::filesystem::exists("no"));
}

TEST(CommandLine, DescribesMistakesAndSuggestsNames)
{
    struct Case {
        char const* line;
        char const* message;
    };
    constexpr Case kCases[] = {
        {"", "modeling: no command is given\nRun \"modeling --help\""},
        {"remove-splinters a b", "there is no command remove-splinters; did you mean remove-slivers?"},
        {"xyzzy a b", "there is no command xyzzy\n"},
        {"--json info a", "--json belongs after the command: info --json\n"},
        {"smooth a", "modeling: smooth needs OUT\nRun \"modeling smooth --help\""},
        {"smooth a b c", "\"c\" is one argument too many for smooth"},
        {"smooth a b --wieghts c", "smooth has no option --wieghts; did you mean --weights?"},
        {"delete-faces a --indexes b", "delete-faces has no option --indexes; did you mean --indices?"},
        {"delete-faces a b", "delete-faces needs one of --indices, --box, --attribute\n"},
        {"delete-faces a b --indices c --attribute d", "takes only one of --indices, --box, --attribute\n"},
        {"delete-faces a b --box 1 2 3", "--box takes 6 values, but 3 were given"},
        {"delete-faces a b --box -.5 2 3 -4 5 nan", "--box: nan is not a number"},
        {"smooth a b --amount 1 --amount 2", "--amount is given more than once"},
        {"smooth a b --threads", "--threads needs a value"},
        {"smooth a b --json=maybe", "--json takes no value"},
        {"delete-faces a b --box 1 2 3 --invert", "--box takes 6 values, but 3 were given"},
        {"delete-faces a b --indices c --invert=false", "--invert takes no value"},
        {"smooth a b --threads=08", "--threads: 08 begins with a zero"},
        {"smooth a b --threads 99999999999", "--threads: 99999999999 is too large"},
        {"smooth a b --threads 2.5", "--threads: 2.5 is not a whole number"},
        {"make-volume a b --attribute c --from 1e99 --to 1", "--from: 1e99 is not a number"},
        {"subdivide a b --tolerance 1 --max-memory 4QB", "4QB is not an amount of memory"},
        {"subdivide a b --tolerance 1 --max-memory 0",
            "--max-memory: 0 is not an amount of memory: a number above 0, in bytes or with a unit, such as 500MB"},
        {"subdivide a b --tolerance 1 --max-memory 1.5.5GB", "1.5.5GB is not an amount of memory"},
        {"smooth a b --center --center-at 1 2 3", "--center excludes --center-at"},
    };
    for (Case const& c : kCases) {
        Result const result = run(wordsOf(c.line));
        EXPECT_EQ(result.exitCode, 2) << c.line;
        EXPECT_THAT(result.messages, HasSubstr(c.message)) << c.line;
    }
}

TEST(CommandLine, NamesTheEmptyArgument)
{
    struct Case {
        std::vector<std::string> line;
        char const* message;
    };
    Case const cases[] = {
        {{"smooth", "a", ""}, "modeling: the argument OUT is empty\nRun \"modeling smooth --help\""},
        {{"smooth", "a", "b", "--weights", ""}, "the value of --weights is empty\n"},
        {{"smooth", "a", "b", "--weights="}, "the value of --weights is empty\n"},
        {{"delete-faces", "a", "b", "--box", "1", "2", "", "4", "5", "6"}, "the value of --box is empty\n"},
        {{"delete-faces", "a", "b", "--indices", ""}, "the value of --indices is empty\n"},
        {{"merge", "a", "", "b"}, "the argument FILES is empty\n"},
        {{"smooth", "a", "b", "--json", ""}, "argument 5 is empty\n"},
        {{"smooth", "", "--help"}, "the argument IN is empty\n"},
        {{""}, "modeling: argument 1 is empty\nRun \"modeling --help\""},
    };
    for (Case const& c : cases) {
        Result const result = run(c.line);
        EXPECT_EQ(result.exitCode, 2) << c.message;
        EXPECT_THAT(result.messages, HasSubstr(c.message));
    }
}

TEST(CommandLine, AcceptsDecimalAmountsOfMemory)
{
    for (char const* const size : {"500MB", "1.5GB", "1.5 gb", "2GiB", ".5k", "1e3", "16EB", "0.5", "7"}) {
        Result const result = run({"subdivide", "a.obj", "--tolerance", "1", "--max-memory", size}); // without OUT
        bool const isAmount = std::string(size) != "1e3" && std::string(size) != "16EB" && std::string(size) != "0.5";
        EXPECT_THAT(result.messages, HasSubstr(isAmount ? "subdivide needs OUT" : "is not an amount of memory"))
            << size;
    }
}

TEST(CommandLine, HelpFitsATerminal)
{
    std::vector<std::vector<std::string>> lines = {{"--help"}};
    for (auto const* commands : {&kCommands, &kHelpers})
        for (std::string const& command : *commands)
            lines.push_back({command, "--help"});
    for (std::vector<std::string> const& line : lines) {
        Result const result = run(line);
        EXPECT_EQ(result.exitCode, 0);
        std::istringstream stream(result.output);
        for (std::string row; std::getline(stream, row);)
            EXPECT_LE(row.size(), 100) << row;
        EXPECT_THAT(result.output, Not(HasSubstr("sPoint"))) << line[0];
        bool const writes = line.size() == 2 && line[0] != "info" && line[0] != "validate"
            && std::count(kHelpers.begin(), kHelpers.end(), line[0]) == 0;
        EXPECT_EQ(result.output.find("-f,--force ") != std::string::npos, writes) << line[0];
    }
}

TEST(CommandLine, HelpIsTheSameInAllForms)
{
    EXPECT_EQ(run({"help"}).output, run({"--help"}).output);
    EXPECT_EQ(run({"help", "smooth"}).output, run({"smooth", "--help"}).output);
    Result const unknown = run({"help", "smoth"});
    EXPECT_EQ(unknown.exitCode, 2);
    EXPECT_THAT(unknown.messages, HasSubstr("there is no command smoth; did you mean smooth?"));
    EXPECT_THAT(run({"completion", "csh"}).messages, HasSubstr("csh"));

    // The manual page and the completions name every option of every command.
    std::string const page = run({"man"}).output, zsh = run({"completion", "zsh"}).output,
                      fish = run({"completion", "fish"}).output;
    auto const escaped = [](std::string const& text) { return std::regex_replace(text, std::regex("-"), "\\-"); };
    for (std::string const& command : kCommands) {
        EXPECT_THAT(page, HasSubstr("\n.SS " + escaped(command) + "\n"));
        std::istringstream help(run({"help", command}).output);
        std::smatch match;
        for (std::string row; std::getline(help, row);) {
            if (!std::regex_search(row, match, std::regex("^ +(?:-.,)?--([a-z-]+)")) || match[1] == "help")
                continue;
            std::string const name = match[1];
            EXPECT_THAT(page, HasSubstr(escaped("--" + name))) << command;
            EXPECT_THAT(zsh, HasSubstr("'--" + name + "[")) << command;
            EXPECT_THAT(fish, HasSubstr("'__fish_seen_subcommand_from " + command + "' -l " + name + " "));
        }
    }
}

TEST(CommandLine, CompletesInBash)
{
    using namespace TestSupport;
    TemporaryFolder const folder;
    store(folder / "completion", run({"completion", "bash"}).output);
    auto const completionsOf = [&](std::string const& words, int index) {
        store(folder / "script",
            "source '" + (folder / "completion").string() + "'; COMP_WORDS=(" + words
                + "); COMP_CWORD=" + std::to_string(index) + "; _modeling; echo \"${COMPREPLY[@]}\" >'"
                + (folder / "words").string() + "'");
        EXPECT_EQ(std::system(("bash '" + (folder / "script").string() + "'").c_str()), 0);
        return contentOf(folder / "words");
    };
    EXPECT_EQ(completionsOf("modeling re", 1), "remove-slivers repair\n");
    EXPECT_EQ(completionsOf("modeling smooth a.obj --pin-", 3), "--pin-attribute --pin-boundary --pin-sharp\n");
    EXPECT_EQ(completionsOf("modeling stitch --normals f", 3), "faces\n");
    EXPECT_EQ(completionsOf("modeling completion ''", 2), "bash zsh fish\n");
    EXPECT_EQ(completionsOf("modeling smooth ''", 2), "\n"); // file names
}

}
