#include "Recipe.h"

#include "files/Scanner.h"
#include "shell/Failure.h"
#include "shell/Suggestion.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <map>
#include <set>

namespace ModelingProgram {

namespace {

    constexpr int kVersion = 1;
    constexpr int kMostCompression = 9;

    [[noreturn]] void refuse(RecipePlace place, std::string const& sentence)
    {
        throw RecipeFailure({ExitCode::CommandLine, sentence}, std::move(place));
    }

    /// Follows the parser, which knows no lines: it reads one character at a time, up to the end of each key.
    class ReadPosition {
    public:
        using iterator_category = std::input_iterator_tag;
        using value_type = char;
        using difference_type = std::ptrdiff_t;
        using pointer = char const*;
        using reference = char const&;

        ReadPosition(char const* position, char const*& last)
            : position_(position)
            , last_(&last)
        {
        }
        reference operator*() const { return *position_; }
        ReadPosition& operator++()
        {
            *last_ = ++position_;
            return *this;
        }
        bool operator==(ReadPosition const& other) const { return position_ == other.position_; }

    private:
        char const* position_;
        char const** last_;
    };

    /// Notes the lines of keys and steps, and refuses what the parser would accept: a key that occurs twice in an
    /// object, of which it would drop one, and values that are nested too deeply to be copied recursively.
    class RecipeParser {
    public:
        explicit RecipeParser(std::string_view text)
            : text_(text)
            , position_(text.data())
        {
        }

        Json parse()
        {
            char const* const end = text_.data() + text_.size();
            return Json::parse(ReadPosition(text_.data(), position_), ReadPosition(end, position_),
                [this](int level, Json::parse_event_t event, Json& value) {
                    look(level, event, value);
                    return true;
                });
        }

        RecipeLines lines;

    private:
        using Event = Json::parse_event_t;

        std::size_t line() const
        {
            // The end of a number is only known after the next character.
            char const* const last = position_ == text_.data() ? position_ : position_ - 1;
            return 1 + static_cast<std::size_t>(std::count(text_.data(), last, '\n'));
        }

        void look(int level, Event event, Json const& value)
        {
            constexpr int kMostLevels = 100;
            if (level > kMostLevels)
                throw RecipeFailure({ExitCode::File, "its values are nested too deeply"}, {}, line());
            if (event == Event::object_start)
                keys_.emplace_back();
            else if (event == Event::object_end)
                keys_.pop_back();
            else if (event == Event::key && !keys_.back().insert(value.get<std::string>()).second)
                throw RecipeFailure(
                    {ExitCode::File, fmt::format("the key {} occurs twice", toText(value))}, {}, line());
            note(level, event, value);
        }

        void note(int level, Event event, Json const& value)
        {
            bool const isStart = event == Event::object_start || event == Event::array_start || event == Event::value;
            if (level == 0 && isStart)
                lines.insert({{}, line()});
            else if (level == 1 && event == Event::key)
                lines.insert({{0, topKey_ = value.get<std::string>()}, line()});
            else if (level == 2 && isStart && topKey_ == "steps")
                lines.insert({{++step_, {}}, line()});
            else if (level == 2 && event == Event::key)
                lines.insert({{0, topKey_ + "." + value.get<std::string>()}, line()});
            else if (level == 3 && event == Event::key && topKey_ == "steps")
                lines.insert({{step_, value.get<std::string>()}, line()});
        }

        std::string_view text_;
        char const* position_; // after what has been parsed
        std::vector<std::set<std::string>> keys_;
        std::string topKey_;
        std::size_t step_ = 0;
    };

    /// The line of a place, or of the smallest part around it that has one.
    std::size_t lineOf(RecipePlace const& place, RecipeLines const& lines)
    {
        std::vector<RecipePlace> parts{place};
        if (place.step != 0)
            parts.push_back({place.step, {}});
        parts.push_back({0, place.step != 0 ? "steps" : place.key.substr(0, place.key.find('.'))});
        parts.push_back({});
        for (RecipePlace const& part : parts)
            if (auto const found = lines.find(part); found != lines.end())
                return found->second;
        return 0;
    }

    char const* nameOfKind(ValueKind kind)
    {
        switch (kind) {
        case ValueKind::Flag:
            return "true or false";
        case ValueKind::Integer:
            return "a whole number";
        case ValueKind::Number:
            return "a number";
        case ValueKind::Size:
            return "a number of bytes or a string such as \"1.5GB\"";
        case ValueKind::Text:
        case ValueKind::File:
            break;
        }
        return "a string";
    }

    /// Programs that know only one type of number write whole numbers as 10.0.
    bool isWhole(Json const& value)
    {
        constexpr double kMost = 9007199254740992; // larger ones may be rounded
        if (!value.is_number_float())
            return value.is_number_integer();
        auto const number = value.get<double>();
        return std::abs(number) <= kMost && number == std::trunc(number);
    }

    bool hasKind(Json const& value, ValueKind kind)
    {
        switch (kind) {
        case ValueKind::Flag:
            return value.is_boolean();
        case ValueKind::Integer:
            return isWhole(value);
        case ValueKind::Number:
            return value.is_number();
        case ValueKind::Size:
            return isWhole(value) || value.is_string();
        case ValueKind::Text:
        case ValueKind::File:
            break;
        }
        return value.is_string();
    }

    std::string wordOf(Json const& value, OptionDescription const& option)
    {
        bool const isInteger = option.kind == ValueKind::Integer || option.kind == ValueKind::Size;
        std::string word = value.is_string()       ? value.get<std::string>()
            : isInteger && value.is_number_float() ? std::to_string(value.get<std::int64_t>())
                                                   : value.dump();
        if (option.kind == ValueKind::File && word.starts_with('-') && word != "-")
            word.insert(0, "./"); // otherwise it would be an option
        return word;
    }

    /// Adds an option as it would be on a command line.
    void addWords(Json const& value, OptionDescription const& option, std::size_t number, std::string const& where,
        std::vector<std::string>& words)
    {
        RecipePlace const place{number, option.name};
        bool const isList = option.count != 1;
        std::vector<Json> const values =
            isList && value.is_array() ? value.get<std::vector<Json>>() : std::vector{value};
        bool const fits = value.is_array() == isList && (!isList || values.size() == option.count)
            && std::all_of(values.begin(), values.end(), [&](Json const& one) { return hasKind(one, option.kind); });
        if (!fits)
            refuse(place,
                fmt::format("{}: \"{}\" has to be {}", where, option.name,
                    isList ? fmt::format("a list of {} values, each {}", option.count, nameOfKind(option.kind))
                           : nameOfKind(option.kind)));
        for (Json const& one : values)
            if (one.is_string() && one.get<std::string>().find('\0') != std::string::npos)
                refuse(place, fmt::format("{}: \"{}\" contains a null character", where, option.name));
        if (option.kind == ValueKind::Flag) {
            if (value.get<bool>())
                words.push_back("--" + option.name);
            return;
        }
        std::string const first = wordOf(values[0], option);
        if (!option.isPositional && first.starts_with('-') && !isList) {
            words.push_back("--" + option.name + "=" + first);
            return;
        }
        if (!option.isPositional)
            words.push_back("--" + option.name);
        for (Json const& one : values)
            words.push_back(wordOf(one, option));
    }

    /// A step as it would be on a command line.
    std::vector<std::string> wordsOf(Json const& step, std::size_t number)
    {
        std::string const place = fmt::format("step {}", number);
        if (!step.is_object())
            refuse({number}, place + ": it has to be an object, such as {\"do\": \"triangulate\"}");
        if (!step.contains("do") || !step["do"].is_string())
            refuse({number, "do"}, place + ": \"do\" has to name what to do");
        std::string const name = step["do"].get<std::string>();
        CommandDescription const known = describeStep(editKindOf(name, number));
        std::string const where = titleOf(number, name);
        std::vector<std::string> names;
        for (OptionDescription const& option : known.options)
            names.push_back(option.name);
        std::vector<std::string> words{name};
        for (auto const& [key, value] : step.items()) {
            auto const option = std::find(names.begin(), names.end(), key);
            if (option != names.end())
                addWords(value, known.options[static_cast<std::size_t>(option - names.begin())], number, where, words);
            else if (key != "do")
                refuse(
                    {number, key}, fmt::format("{}: there is no key \"{}\"{}", where, key, suggestionFor(key, names)));
        }
        return words;
    }

    void refuseOtherKeys(Json const& object, std::string const& path, std::vector<std::string> const& names)
    {
        for (auto const& [key, value] : object.items())
            if (std::find(names.begin(), names.end(), key) == names.end())
                refuse({0, path + key}, fmt::format("there is no key \"{}\"{}", key, suggestionFor(key, names)));
    }

    Json const& stepsIn(Json const& recipe)
    {
        if (!recipe.is_object() || !recipe.contains("modeling") || recipe["modeling"] != kVersion)
            refuse({0, "modeling"},
                fmt::format(
                    "it is no recipe of version {0}, which would be an object with \"modeling\": {0}", kVersion));
        refuseOtherKeys(recipe, {}, {"modeling", "steps", "output", "$schema"});
        if (!recipe.contains("steps") || !recipe["steps"].is_array() || recipe["steps"].empty())
            refuse({0, "steps"}, "\"steps\" has to be a list of at least one step");
        return recipe["steps"];
    }

    std::vector<std::string> writableFormats()
    {
        std::vector<std::string> names = geometryFormats();
        std::erase_if(names, [](std::string const& name) { return !isWritableFormat("." + name); });
        return names;
    }

    Output outputIn(Json const& recipe)
    {
        Output output;
        if (!recipe.contains("output"))
            return output;
        Json const& values = recipe["output"];
        if (!values.is_object())
            refuse({0, "output"}, "\"output\" has to be an object, such as {\"format\": \"ply\"}");
        refuseOtherKeys(values, "output.", {"format", "compress"});
        if (values.contains("format")) {
            std::vector<std::string> const names = writableFormats();
            Json const& format = values["format"];
            if (!format.is_string() || std::find(names.begin(), names.end(), format.get<std::string>()) == names.end())
                refuse({0, "output.format"}, fmt::format("\"format\" has to be one of {}", listOf(names)));
            output.format = "." + format.get<std::string>();
        }
        if (values.contains("compress")) {
            Json const& level = values["compress"];
            if (!isWhole(level) || level.get<double>() < 1 || level.get<double>() > kMostCompression)
                refuse({0, "output.compress"},
                    fmt::format("\"compress\" has to be a whole number from 1 to {}", kMostCompression));
            if (!output.format.empty() && output.format != ".h5")
                refuse({0, "output.compress"}, "\"compress\" applies to HDF5 files only: the format h5");
            output.compression = level.get<unsigned int>();
        }
        return output;
    }

    /// The key of a step that a message is about: one whose option it names.
    std::string keyNamedBy(std::string const& message, Json const& step)
    {
        for (auto const& [key, value] : step.items())
            if (message.find("--" + key) != std::string::npos)
                return key;
        return {};
    }

    Step parseJsonStep(Json const& values, std::size_t number)
    {
        std::vector<std::string> const words = wordsOf(values, number);
        try {
            return parseStep(words, number);
        } catch (Failure const& failure) {
            throw RecipeFailure(failure, {number, keyNamedBy(failure.what(), values)});
        }
    }

    /// The value as it is in a recipe.
    Json valueOf(std::string const& word, ValueKind kind)
    {
        if (kind == ValueKind::Flag)
            return true;
        bool const isNumber = kind == ValueKind::Integer || kind == ValueKind::Number
            || (kind == ValueKind::Size && word.find_first_not_of("0123456789") == std::string::npos);
        if (!isNumber) {
            try {
                static_cast<void>(Json(word).dump());
            } catch (Json::type_error const&) {
                throw Failure(ExitCode::CommandLine,
                    fmt::format("{} is not UTF-8, which recipes are", TextScanner::quoted(word)));
            }
            return word;
        }
        return Json::accept(word) ? Json::parse(word) : Json(std::strtod(word.c_str(), nullptr));
    }

    Json schemaOfValue(OptionDescription const& option)
    {
        Json schema;
        switch (option.kind) {
        case ValueKind::Flag:
            schema["type"] = "boolean";
            break;
        case ValueKind::Integer:
            schema["type"] = "integer";
            break;
        case ValueKind::Number:
            schema["type"] = "number";
            break;
        case ValueKind::Size:
            schema["type"] = {"integer", "string"};
            break;
        case ValueKind::Text:
        case ValueKind::File:
            schema["type"] = "string";
            schema["minLength"] = 1;
            break;
        }
        if (option.isPositive)
            schema["exclusiveMinimum"] = 0;
        auto const addBound = [&](char const* key, std::optional<double> const& bound) {
            if (bound)
                schema[key] = std::abs(*bound) < 0x1p53 && *bound == std::trunc(*bound)
                    ? Json(static_cast<std::int64_t>(*bound))
                    : Json(*bound);
        };
        addBound("minimum", option.least);
        addBound("maximum", option.most);
        for (std::string const& choice : option.choices)
            schema["enum"].push_back(valueOf(choice, option.kind));
        return schema;
    }

    Json schemaOfOption(OptionDescription const& option)
    {
        Json schema = {{"description", option.description}};
        if (option.count == 1)
            schema.update(schemaOfValue(option));
        else
            schema.update({{"type", "array"}, {"items", schemaOfValue(option)}, {"minItems", option.count},
                {"maxItems", option.count}});
        if (!option.defaultValue.empty())
            schema["default"] = valueOf(option.defaultValue, option.kind);
        return schema;
    }

    Json schemaOfOutput()
    {
        Json const format = {{"description", "The format"}, {"type", "string"}, {"enum", writableFormats()}};
        Json const compress = {{"description", "Compress HDF5 files, from 1 (fast) to 9 (small)"}, {"type", "integer"},
            {"minimum", 1}, {"maximum", kMostCompression}};
        return {{"description", "What to write if the recipe is run on many files"}, {"type", "object"},
            {"properties", {{"format", format}, {"compress", compress}}}, {"additionalProperties", false}};
    }

    Json schemaOfStep(EditKind const& kind)
    {
        CommandDescription const step = describeStep(kind);
        Json properties = {{"do", {{"const", kind.help.name}}}}, required = {"do"}, needs = Json::object();
        std::map<int, Json> groups;
        for (OptionDescription const& option : step.options) {
            properties[option.name] = schemaOfOption(option);
            if (option.isRequired)
                required.push_back(option.name);
            if (!option.needs.empty())
                needs[option.name] = option.needs;
            if (option.group >= 0)
                groups[option.group].push_back({{"required", {option.name}}});
        }
        Json schema = {{"description", kind.help.summary}, {"type", "object"}, {"properties", properties},
            {"required", required}, {"additionalProperties", false}};
        if (!needs.empty())
            schema["dependentRequired"] = needs;
        for (auto const& [group, alternatives] : groups)
            schema["oneOf"] = alternatives;
        return schema;
    }

}

Recipe parseRecipe(std::string_view text)
{
    RecipeParser parser(text);
    try {
        Json const document = parser.parse();
        Recipe recipe;
        for (Json const& step : stepsIn(document))
            recipe.steps.push_back(parseJsonStep(step, recipe.steps.size() + 1));
        recipe.output = outputIn(document);
        recipe.lines = std::move(parser.lines);
        return recipe;
    } catch (Json::exception const& error) {
        std::string const why = error.what(); // "[json.exception.parse_error.101] parse error at line 1, ..."
        throw RecipeFailure({ExitCode::File, why.substr(std::min(why.find("] ") + 2, why.size()))}, {});
    } catch (RecipeFailure const& failure) {
        std::size_t const line = failure.line != 0 ? failure.line : lineOf(failure.place, parser.lines);
        throw RecipeFailure(failure, failure.place, line);
    }
}

void checkRecipe(Recipe const& recipe, std::string const& format)
{
    RecipePlace place;
    try {
        requireChain(recipe.steps, 1);
        if (!format.empty())
            requireFit(recipe.steps, {"output" + format});
    } catch (StepFailure const& failure) {
        place.step = failure.step;
        throw RecipeFailure(failure, place, lineOf(place, recipe.lines));
    } catch (Failure const& failure) {
        place.key = "output.format";
        throw RecipeFailure(failure, place, lineOf(place, recipe.lines));
    }
}

std::vector<Step> readRecipe(std::filesystem::path const& file)
{
    InputFile const input(file);
    try {
        return parseRecipe({input.bytes.get(), input.size}).steps;
    } catch (RecipeFailure const& failure) {
        std::string const line = failure.line != 0 ? fmt::format("line {}: ", failure.line) : "";
        if (failure.code == ExitCode::File)
            throw FileError(fmt::format("{} cannot be read: {}{}", file.string(), line, failure.what()));
        throw Failure(failure.code, fmt::format("{}: {}{}", file.string(), line, failure.what()), failure.reasons);
    }
}

Json recipeOf(std::vector<Step> const& steps)
{
    Json recipe = {{"modeling", kVersion}, {"steps", Json::array()}};
    for (Step const& step : steps) {
        Json values = {{"do", step.kind->help.name}};
        for (OptionDescription const& option : step.options.options) {
            if (option.given.empty())
                continue;
            Json list = Json::array();
            for (std::string const& word : option.given)
                list.push_back(valueOf(word, option.kind));
            values[option.name] = option.count == 1 ? list[0] : list;
        }
        recipe["steps"].push_back(values);
    }
    return recipe;
}

Json recipeSchema()
{
    Json names = Json::array(), definitions = Json::object();
    for (EditKind const* const kind : editKinds()) {
        names.push_back({{"$ref", fmt::format("#/$defs/{}", kind->help.name)}});
        definitions[kind->help.name] = schemaOfStep(*kind);
    }
    return {{"$schema", "https://json-schema.org/draft/2020-12/schema"}, {"title", "A recipe of modeling run"},
        {"type", "object"},
        {"properties",
            {{"$schema", {{"type", "string"}}}, {"modeling", {{"description", "The version"}, {"const", kVersion}}},
                {"steps", {{"type", "array"}, {"minItems", 1}, {"items", {{"oneOf", names}}}}},
                {"output", schemaOfOutput()}}},
        {"required", {"modeling", "steps"}}, {"additionalProperties", false}, {"$defs", definitions}};
}

}
