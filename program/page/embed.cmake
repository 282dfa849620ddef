# Writes the source that contains the viewer:
#     cmake -DOUTPUT= -DFOLDER= -DSCRIPTS= -P <this>
# The scripts are joined in their order. The hashes are those of the policy of a page, which allows these texts only.

cmake_minimum_required(VERSION 3.25)

set(digits ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/)

# A SHA-256 in base64: 64 hexadecimal digits, six of which are four characters.
function(hash_of text result)
    string(SHA256 hex "${text}")
    string(APPEND hex 00)
    set(encoded "")
    foreach(first RANGE 0 60 6)
        string(SUBSTRING ${hex} ${first} 6 group)
        foreach(shift 18 12 6 0)
            math(EXPR digit "(0x${group} >> ${shift}) & 63")
            string(SUBSTRING ${digits} ${digit} 1 character)
            string(APPEND encoded ${character})
        endforeach()
    endforeach()
    string(SUBSTRING ${encoded} 0 43 encoded)
    set(${result} "${encoded}=" PARENT_SCOPE)
endfunction()

# Literals of at most 16,000 characters, whose suffix takes their length from the compiler: counting it in constant expressions
# exceeds the number of steps that clang allows.
function(parts_of text result)
    string(LENGTH "${text}" length)
    set(parts "")
    set(first 0)
    while(first LESS length)
        string(SUBSTRING "${text}" ${first} 16000 part)
        string(APPEND parts "    R\"viewer(${part})viewer\"sv,\n")
        math(EXPR first "${first} + 16000")
    endwhile()
    set(${result} "${parts}" PARENT_SCOPE)
endfunction()

file(READ ${FOLDER}/viewer.css style)
set(script "")
string(REPLACE "," ";" SCRIPTS "${SCRIPTS}")
foreach(name IN LISTS SCRIPTS)
    file(READ ${FOLDER}/${name} text)
    string(APPEND script "${text}")
endforeach()
if("${style}${script}" MATCHES "</(script|style)")
    message(FATAL_ERROR "the viewer contains a tag that would end its element: ${CMAKE_MATCH_0}")
endif()

hash_of("${style}" style_hash)
hash_of("${script}" script_hash)
parts_of("${style}" style_parts)
parts_of("${script}" script_parts)
file(WRITE ${OUTPUT} "#include \"page/Viewer.h\"

namespace ModelingProgram {

namespace {

using namespace std::string_view_literals;

constexpr std::string_view kStyle[] = {
${style_parts}};
constexpr std::string_view kScript[] = {
${script_parts}};

}

Viewer const& viewer()
{
    static constexpr Viewer kViewer = {kStyle, kScript, \"${style_hash}\", \"${script_hash}\"};
    return kViewer;
}

}
")
