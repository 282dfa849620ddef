#pragma once

#include <exception>
#include <filesystem>
#include <optional>
#include <string>

namespace ModelingProgram {

// Standard streams, pipes and whatever else has no name or size of its own.

inline constexpr char kStandardInput[] = "/dev/stdin";
inline constexpr char kStandardOutput[] = "/dev/stdout";

/// Thrown if the job is cancelled while another program is waited for.
class Cancelled : public std::exception {
public:
    char const* what() const noexcept override { return "cancelled"; }
};

/// The open descriptor that a name such as /dev/stdin or /dev/fd/63 stands for.
std::optional<int> descriptorOf(std::filesystem::path const& file);

/// A name of an open file, whether or not it has another one.
std::string nameOfDescriptor(int descriptor);

/// Whether a file is written from one end to the other and cannot be replaced: a descriptor, a pipe or a device.
bool isStream(std::filesystem::path const& file);

/// Whether a name, such as a link to /dev/stdout, leads to standard output.
bool isStandardOutput(std::filesystem::path const& file);

/// From now on only files written to /dev/stdout go there. What the program prints goes to standard error instead.
void reserveStandardOutput();

/// A name by which a file can be opened as a regular one, any number of times. Standard input, pipes and terminals are
/// read to their end the first time; their content is copied to a temporary file without a name, in $TMPDIR or /tmp,
/// which exists as long as the program runs.
/// \throws FileError  if there is no such file, or if it is a folder or a device
/// \throws Cancelled
std::filesystem::path regularFileOf(std::filesystem::path const& file);

/// Opens a pipe or device for writing. A pipe waits for a reader.
/// \return -1 and errno if that fails
/// \throws Cancelled
int openForWriting(std::filesystem::path const& file);

/// A new file without a name for temporary data, or -1 and errno.
int openTemporary();

}
