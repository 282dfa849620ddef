#include "commands/Recipe.h"
#include "shell/Failure.h"
#include "shell/ShellWords.h"

#include "program/RunProgram.h"
#include "program/TemporaryFolder.h"

#include <gmock/gmock.h>

namespace ModelingProgram {

namespace {

    using namespace TestSupport;
    using testing::ElementsAre;
    using testing::HasSubstr;

    class Run : public testing::Test {
    protected:
        std::string at(char const* name) const { return (folder / name).string(); }
        static std::string sample(std::string const& name) { return MODELING_SAMPLES "/" + name; }

        /// Runs steps on a file, and each of them as a command of its own. \return both results
        std::pair<std::string, std::string> runBothWays(
            std::string const& sampleName, std::vector<std::vector<std::string>> const& steps)
        {
            std::string last = sample(sampleName), text;
            for (std::vector<std::string> const& words : steps) {
                std::string const next = at((std::to_string(text.size()) + ".ply").c_str());
                std::vector<std::string> line{words[0], last, next};
                line.insert(line.end(), words.begin() + 1, words.end());
                EXPECT_EQ(run(line).exitCode, 0) << words[0];
                for (std::string const& word : words)
                    text += "'" + word + "' ";
                text += ";\n";
                last = next;
            }
            EXPECT_EQ(run({"run", sample(sampleName), at("chain.ply"), "--do", text}).exitCode, 0) << text;
            return {contentOf(folder / "chain.ply"), contentOf(last)};
        }

        TemporaryFolder folder;
    };

}

TEST(ShellWords, SplitsAsAShellDoes)
{
    EXPECT_THAT(splitCommands("a 'b ; c' \"d \\\" e\" f\\ g;;\n h=\"1;2\"'3' \n"),
        ElementsAre(ElementsAre("a", "b ; c", "d \" e", "f g"), ElementsAre("h=1;23")));
    EXPECT_THAT(splitCommands("'' \"\\n\""), ElementsAre(ElementsAre("", "\\n")));
    EXPECT_TRUE(splitCommands(" ; \n").empty());
    EXPECT_THROW(splitCommands("a; b 'c"), Failure);
}

TEST_F(Run, GivesTheResultOfTheSingleCommands)
{
    auto const [chain, single] = runBothWays("bunny.obj",
        {{"subdivide", "--relative", "0.01"}, {"smooth", "--amount", "1"}, {"remove-slivers", "--ratio", "0.3"},
            {"delete-faces", "--box", "-5", "-1", "-4", "5", "5", "4"}});
    EXPECT_FALSE(chain.empty());
    EXPECT_TRUE(chain == single);
}

TEST_F(Run, ReportsEachStepAndMergesFirst)
{
    Result const done = run({"run", sample("cube.ply"), sample("spider.obj"), at("out.vtp"), "--json", "--do",
        "merge --source-attribute 'from file'; delete-faces --attribute 'from file' --invert; triangulate"});
    ASSERT_EQ(done.exitCode, 0) << done.messages;
    Json const report = Json::parse(done.output);
    EXPECT_EQ(report["inputs"].size(), 2);
    ASSERT_EQ(report["steps"].size(), 3);
    EXPECT_EQ(report["steps"][1]["picked"], 6); // the faces of the first file
    EXPECT_EQ(report["steps"][1]["after"]["faces"], 1368);
    EXPECT_EQ(report["steps"][2]["do"], "triangulate");
    EXPECT_GE(report["seconds"].get<double>(), report["steps"][0]["seconds"].get<double>());
    double operations = 0, sum = 0;
    for (Json const& step : report["steps"]) {
        operations += step["phaseSeconds"]["operation"].get<double>();
        EXPECT_GE(step["phaseSeconds"]["operation"], step["seconds"]);
        EXPECT_GT(step["phaseSeconds"]["report"], 0);
    }
    Json const& times = report["phaseSeconds"];
    EXPECT_DOUBLE_EQ(times["operation"].get<double>(), operations);
    for (char const* const part : {"reading", "operation", "report", "writing"}) {
        EXPECT_GT(times[part], 0) << part;
        sum += times[part].get<double>();
    }
    EXPECT_GE(times["total"], sum);
    EXPECT_EQ(report["output"], at("out.vtp"));

    // A template is laid on the current mesh, and the strands go on as the geometry.
    Result const laid = run({"run", sample("cube.ply"), at("out.obj"), "--do",
        "stitch --template '" + sample("stitch-quad.obj") + "' '" + sample("stitch-quad-rings.obj") + "'"});
    EXPECT_EQ(laid.exitCode, 0) << laid.messages;
    EXPECT_THAT(laid.output, testing::AllOf(HasSubstr("step 1 (stitch)\n"), HasSubstr("laid on 6 faces")));
    EXPECT_THAT(run({"info", at("out.obj")}).output, HasSubstr("strand set"));
}

TEST_F(Run, RefusesStepsThatCannotBe)
{
    struct Case {
        char const* steps;
        int exitCode;
        char const* message;
    };
    constexpr Case kCases[] = {
        {"triangulate; smoth", 2, "step 2: there is no step \"smoth\"; did you mean smooth?"},
        {"triangulate; info", 2, "step 2: there is no step \"info\""},
        {"subdivide --realtive 1", 2,
            "step 1 (subdivide): subdivide has no option --realtive; did you mean --relative?"},
        {"triangulate; subdivide", 2, "step 2 (subdivide): subdivide needs one of --tolerance, --relative"},
        {"smooth --json", 2, "smooth has no option --json"},
        {"smooth a", 2, "\"a\" is one argument too many"},
        {"smooth --weights ''", 2, "the value of --weights is empty"},
        {"triangulate --channels ','", 2, "step 1 (triangulate): --channels: the list has no entry"},
        {"triangulate; merge", 2, "step 2 (merge): it can only be the first step"},
        {"add-points a.ply; smooth", 2, "step 2 (smooth): it needs a mesh, but step 1 makes a point cloud"},
        {"triangulate; smooth --amount 2000", 2, "step 2 (smooth): --amount: 2000 is not a number from 0 to 1000"},
        {";", 2, "--do has no step"},
        {"smooth; smooth 'a", 2, "the quotation that begins at 'a has no end"},
        {"triangulate; subdivide --relative 0.1", 5, "which the result of step 1 does not contain"},
        {"add-points none.ply", 5, "step 1 (add-points): add-points needs a point cloud, but"},
        {"triangulate; delete-faces --indices none", 3, "step 2 (delete-faces): none"},
    };
    for (Case const& c : kCases) {
        Result const result = run({"run", sample("cube.ply"), at("out.ply"), "--do", c.steps});
        EXPECT_EQ(result.exitCode, c.exitCode) << c.steps;
        EXPECT_THAT(result.messages, HasSubstr(c.message)) << c.steps;
        EXPECT_FALSE(std::filesystem::exists(folder / "out.ply")) << c.steps;
    }
    EXPECT_THAT(
        run({"run", "a", "b", "c", "--do", "smooth"}).messages, HasSubstr("it takes one file, but 2 are given"));
    EXPECT_EQ(run({"run", "none.ply", at("out.stl"), "--do", "add-points none.ply"}).exitCode, 3);
    EXPECT_THAT(run({"run", "-o", at("out.ply"), "--do", "merge"}).messages, HasSubstr("run needs input files"));
    Result const unread = run({"run", sample("cube.ply"), "none.ply", at("out.ply"), "--json", "--do", "merge"});
    EXPECT_THAT(unread.messages, HasSubstr("modeling: step 1 (merge): none.ply cannot be read"));
    EXPECT_EQ(Json::parse(unread.output)["failedStep"], 1);
    for (auto const& [last, exitCode] : {std::pair{"triangulate", 5}, {"delete-faces --attribute file", 0}}) {
        Result const tagged = run({"run", sample("cube.ply"), sample("spider.obj"), at("out.obj"), "--do",
            std::string("merge --source-attribute file;") + last});
        EXPECT_EQ(tagged.exitCode, exitCode) << tagged.messages;
        EXPECT_EQ(tagged.messages.find("step 1 (merge): --source-attribute: ") != std::string::npos, exitCode == 5);
    }
    Result const failed = run(
        {"run", sample("cube.ply"), at("out.ply"), "--json", "--do", "triangulate; smooth; subdivide --relative 0.1"});
    Json const report = Json::parse(failed.output);
    EXPECT_EQ(report["failedStep"], 3);
    EXPECT_EQ(report["steps"].size(), 3);
    EXPECT_THAT(failed.messages, HasSubstr("modeling: warning: step 2 (smooth): the shape changed"));
}

TEST_F(Run, ReadsTheRecipeThatItPrints)
{
    std::string const steps = "triangulate --channels '-n*' --keep-units; delete-faces --invert --box -1 -1 -1 1 1 .5;"
                              "add-points -- a.ply; subdivide --relative 1e-2 --max-memory 1.5GB;"
                              "stitch --template a b --normals faces --rotate 3";
    Json const expected = Json::parse(R"({"modeling": 1, "steps": [
        {"do": "triangulate", "channels": "-n*", "keep-units": true},
        {"do": "delete-faces", "invert": true, "box": [-1, -1, -1, 1, 1, 0.5]},
        {"do": "add-points", "points": "a.ply"},
        {"do": "subdivide", "max-memory": 1500000000, "relative": 0.01},
        {"do": "stitch", "template": ["a", "b"], "normals": "faces", "rotate": 3}]})");
    Json const printed = Json::parse(run({"run", "--do", steps, "--print-recipe"}).output);
    EXPECT_EQ(nlohmann::json(printed), nlohmann::json(expected));
    store(folder / "recipe.json", toText(expected));
    EXPECT_EQ(Json::parse(run({"run", "--recipe", at("recipe.json"), "--print-recipe"}).output), printed);
    Json floats = expected; // of programs that know no integers
    floats["steps"][3]["max-memory"] = 1.5e9;
    floats["steps"][4]["rotate"] = 3.0;
    store(folder / "recipe.json", toText(floats));
    EXPECT_EQ(Json::parse(run({"run", "--recipe", at("recipe.json"), "--print-recipe"}).output), printed);

    store(
        folder / "recipe.json", R"({"$schema": "x", "modeling": 1, "steps": [{"do": "triangulate", "check": false}]})");
    EXPECT_EQ(run({"run", sample("cube.ply"), at("out.ply"), "--recipe", at("recipe.json")}).exitCode, 0);
    EXPECT_EQ(run({"triangulate", sample("cube.ply"), at("single.ply")}).exitCode, 0);
    EXPECT_TRUE(contentOf(folder / "out.ply") == contentOf(folder / "single.ply"));
}

TEST_F(Run, RefusesRecipesAndSaysWhere)
{
    struct Case {
        std::string recipe;
        int exitCode;
        char const* message;
    };
    auto const step = [](std::string const& text) {
        return R"({"modeling": 1, "steps": [{"do": "triangulate"}, )" + text + "]}";
    };
    auto const output = [](std::string const& value) {
        return R"({"modeling": 1, "steps": [{"do": "triangulate"}], "output": )" + value + "}";
    };
    Case const cases[] = {
        {"", 3, "recipe.json cannot be read: "},
        {"{\"modeling\": 1,}", 3, "recipe.json cannot be read: parse error at line 1, column 16"},
        {"{\"modeling\": 1e999}", 3, "recipe.json cannot be read: number overflow"},
        {step("{\"do\": \"smooth\", \"do\": \"merge\"}"), 3, "the key \"do\" occurs twice"},
        {std::string(1000, '[') + std::string(1000, ']'), 3, "its values are nested too deeply"},
        {"[]", 2, "recipe.json: line 1: it is no recipe of version 1"},
        {R"({"modeling": 2, "steps": []})", 2, "it is no recipe of version 1"},
        {R"({"modeling": 1, "steps": []})", 2, "\"steps\" has to be a list of at least one step"},
        {R"({"modeling": 1, "stesp": []})", 2, "there is no key \"stesp\"; did you mean steps?"},
        {step("[]"), 2, "recipe.json: line 1: step 2: it has to be an object"},
        {step(R"({"amount": 1})"), 2, "step 2: \"do\" has to name what to do"},
        {step(R"({"do": "smoothe"})"), 2, "step 2: there is no step \"smoothe\"; did you mean smooth?"},
        {step(R"({"do": "smooth", "amuont": 1})"), 2,
            "step 2 (smooth): there is no key \"amuont\"; did you mean amount?"},
        {step(R"({"do": "smooth", "help": true})"), 2, "there is no key \"help\""},
        {step(R"({"do": "smooth", "amount": "1"})"), 2, "\"amount\" has to be a number"},
        {step(R"({"do": "smooth", "amount": -1})"), 2, "step 2 (smooth): --amount: -1 is not a number from 0 to 1000"},
        {step(R"({"do": "smooth", "pin-boundary": 1})"), 2, "\"pin-boundary\" has to be true or false"},
        {step(R"({"do": "smooth", "weights": ""})"), 2, "the value of --weights is empty"},
        {step(R"({"do": "smooth", "weights": "a\u0000b"})"), 2, "\"weights\" contains a null character"},
        {step(R"({"do": "delete-faces", "box": [1, 2]})"), 2, "\"box\" has to be a list of 6 values, each a number"},
        {step(R"({"do": "delete-faces", "box": 1})"), 2, "\"box\" has to be a list of 6 values"},
        {step(R"({"do": "stitch", "template": ["a", "b"], "rotate": 1.5})"), 2, "\"rotate\" has to be a whole number"},
        {step(R"({"do": "stitch", "template": ["a", "b"], "rotate": 1e300})"), 2, "has to be a whole number"},
        {step(R"({"do": "subdivide"})"), 2, "step 2 (subdivide): subdivide needs one of --tolerance, --relative"},
        {step(R"({"do": "subdivide", "relative": 1, "max-memory": []})"), 2, "has to be a number of bytes or a string"},
        // lines: of the key, of the step if no key is at fault, of the value that is no step
        {step("\n{\"do\": \"smooth\",\n\"amuont\": 1\n}\n"), 2,
            "recipe.json: line 3: step 2 (smooth): there is no key"},
        {step("\n{\"do\": \"smooth\",\n\"amount\":\n-1}"), 2, "recipe.json: line 3: step 2 (smooth): --amount"},
        {step("{\"do\": \"merge\"},\n\n{\"do\": \"subdivide\"\n}\n"), 2, "recipe.json: line 3: step 3 (subdivide): "},
        {step("\n17\n"), 2, "recipe.json: line 2: step 2: it has to be an object"},
        {step("{\"do\":\n\"smooth\",\n\"do\": 1}"), 3,
            "recipe.json cannot be read: line 3: the key \"do\" occurs twice"},
        {"{\"modeling\": 1,\n\"stesp\": 1}", 2, "recipe.json: line 2: there is no key \"stesp\""},
        {output("\n17"), 2, "line 1: \"output\" has to be an object"},
        {output("{\n\"format\": \"off\"}"), 2, "line 2: \"format\" has to be one of glb, h5, "},
        {output(R"({"compress": 10})"), 2, "\"compress\" has to be a whole number from 1 to 9"},
        {output(R"({"compress": 1, "format": "ply"})"), 2, "\"compress\" applies to HDF5 files only"},
        {output(R"({"formt": "ply"})"), 2, "there is no key \"formt\"; did you mean format?"},
    };
    for (Case const& c : cases) {
        store(folder / "recipe.json", c.recipe);
        Result const result = run({"run", sample("cube.ply"), at("out.ply"), "--recipe", at("recipe.json")});
        EXPECT_EQ(result.exitCode, c.exitCode) << c.recipe;
        EXPECT_THAT(result.messages, HasSubstr(c.message)) << c.recipe;
    }
    EXPECT_EQ(run({"run", "--recipe", at("none.json"), "--print-recipe"}).exitCode, 3);
}

/// The schema in the repository is what other programs read. After a change of an option, write it again:
/// `modeling run --print-schema > docs/recipe.schema.json`.
TEST(Recipe, HasTheSchemaOfTheRepository)
{
    EXPECT_EQ(contentOf(MODELING_DOCS "/recipe.schema.json"), toText(recipeSchema()) + "\n");
    Json const steps = recipeSchema()["$defs"];
    EXPECT_EQ(steps.size(), editKinds().size());
    for (EditKind const* const kind : editKinds()) {
        Json const& declared = steps[kind->help.name]["properties"];
        EXPECT_EQ(declared.size(), describeStep(*kind).options.size() + 1) << kind->help.name; // and "do"
    }
    EXPECT_EQ(steps["smooth"]["properties"]["amount"]["maximum"], 1000);
    EXPECT_EQ(steps["delete-faces"]["properties"]["box"]["minItems"], 6);
}

}
