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

    [[noreturn]] void refuse(std::string const& where, std::string const& why)
    {
        throw Failure(ExitCode::CommandLine, fmt::format("{}: {}", where, why));
    }

    /// Refuses a key that occurs twice in an object, of which the parser would drop one.
    Json parseJson(std::string_view text, std::filesystem::path const& file)
    {
        constexpr int kMostLevels = 100; // values are copied recursively
        std::vector<std::set<std::string>> keys;
        auto const check = [&](int level, Json::parse_event_t event, Json& value) {
            if (level > kMostLevels)
                throw FileError(fmt::format("{} cannot be read: its values are nested too deeply", file.string()));
            if (event == Json::parse_event_t::object_start)
                keys.emplace_back();
            else if (event == Json::parse_event_t::object_end)
                keys.pop_back();
            else if (event == Json::parse_event_t::key && !keys.back().insert(value.get<std::string>()).second)
                throw FileError(
                    fmt::format("{} cannot be read: the key {} occurs twice", file.string(), toText(value)));
            return true;
        };
        try {
            return Json::parse(text, check);
        } catch (Json::exception const& error) {
            std::string const why = error.what(); // "[json.exception.parse_error.101] parse error at line 1, ..."
            std::size_t const start = std::min(why.find("] ") + 2, why.size());
            throw FileError(fmt::format("{} cannot be read: {}", file.string(), why.substr(start)));
        }
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
    void addWords(
        Json const& value, OptionDescription const& option, std::string const& where, std::vector<std::string>& words)
    {
        bool const isList = option.count != 1;
        std::vector<Json> const values =
            isList && value.is_array() ? value.get<std::vector<Json>>() : std::vector{value};
        bool const fits = value.is_array() == isList && (!isList || values.size() == option.count)
            && std::all_of(values.begin(), values.end(), [&](Json const& one) { return hasKind(one, option.kind); });
        if (!fits)
            refuse(where,
                fmt::format("\"{}\" has to be {}", option.name,
                    isList ? fmt::format("a list of {} values, each {}", option.count, nameOfKind(option.kind))
                           : nameOfKind(option.kind)));
        for (Json const& one : values)
            if (one.is_string() && one.get<std::string>().find('\0') != std::string::npos)
                refuse(where, fmt::format("\"{}\" contains a null character", option.name));
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
            refuse(place, "it has to be an object, such as {\"do\": \"triangulate\"}");
        if (!step.contains("do") || !step["do"].is_string())
            refuse(place, "\"do\" has to name what to do");
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
                addWords(value, known.options[static_cast<std::size_t>(option - names.begin())], where, words);
            else if (key != "do")
                refuse(where, fmt::format("there is no key \"{}\"{}", key, suggestionFor(key, names)));
        }
        return words;
    }

    Json const& stepsIn(Json const& recipe)
    {
        if (!recipe.is_object() || !recipe.contains("modeling") || recipe["modeling"] != kVersion)
            throw Failure(ExitCode::CommandLine,
                fmt::format(
                    "it is no recipe of version {0}, which would be an object with \"modeling\": {0}", kVersion));
        for (auto const& [key, value] : recipe.items())
            if (key != "modeling" && key != "steps" && key != "$schema")
                throw Failure(ExitCode::CommandLine,
                    fmt::format("there is no key \"{}\"{}", key, suggestionFor(key, {"modeling", "steps", "$schema"})));
        if (!recipe.contains("steps") || !recipe["steps"].is_array() || recipe["steps"].empty())
            throw Failure(ExitCode::CommandLine, "\"steps\" has to be a list of at least one step");
        return recipe["steps"];
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
                schema[key] = *bound == static_cast<double>(static_cast<std::int64_t>(*bound))
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

std::vector<Step> readRecipe(std::filesystem::path const& file)
{
    InputFile const input(file);
    Json const recipe = parseJson({input.bytes.get(), input.size}, file);
    try {
        std::vector<Step> steps;
        for (Json const& step : stepsIn(recipe))
            steps.push_back(parseStep(wordsOf(step, steps.size() + 1), steps.size() + 1));
        return steps;
    } catch (Failure const& failure) {
        throw Failure(failure.code, fmt::format("{}: {}", file.string(), failure.what()), failure.reasons);
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
                {"steps", {{"type", "array"}, {"minItems", 1}, {"items", {{"oneOf", names}}}}}}},
        {"required", {"modeling", "steps"}}, {"additionalProperties", false}, {"$defs", definitions}};
}

}
