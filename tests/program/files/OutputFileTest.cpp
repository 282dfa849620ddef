#include "OutputFile.h"
#include "FileSupport.h"

#include "program/NamedFilesOnly.h"

#include <csignal>

#include <unistd.h>

namespace ModelingProgram {

namespace {

    using std::filesystem::perms;
    using testing::AllOf;
    using testing::HasSubstr;

    void write(std::filesystem::path const& file, Existing existing, std::string_view text)
    {
        OutputFile out(file, existing);
        out << text;
        out.commit();
    }

    std::string refusalOfWriting(std::filesystem::path const& file, Existing existing)
    {
        try {
            write(file, existing, "new");
        } catch (FileError const& error) {
            return error.what();
        }
        return {};
    }

    /// Runs in a process of its own, whose exit code says whether there was a failure.
    void checkFolder(TemporaryFolder const& folder)
    {
        write(folder / "a", Existing::Keep, "first");
        EXPECT_THAT(refusalOfWriting(folder / "a", Existing::Keep), HasSubstr("File exists"));
        std::filesystem::permissions(folder / "a", perms::owner_read | perms::owner_write);
        write(folder / "a", Existing::Replace, "second");
        EXPECT_EQ(contentOf(folder / "a"), "second");
        EXPECT_EQ(std::filesystem::status(folder / "a").permissions(), perms::owner_read | perms::owner_write);
        {
            OutputFile late(folder / "late", Existing::Keep);
            store(folder / "late", "of another program");
            EXPECT_THROW(late.commit(), FileError);
        }
        {
            OutputFile early(folder / "early", Existing::Replace);
            store(folder / "early", "of another program");
            early << "replaced";
            early.commit();
        }
        { // also for the superuser
            std::filesystem::permissions(folder / "late", perms::owner_read);
            std::filesystem::create_symlink("late", folder / "link");
            for (char const* const name : {"late", "link"})
                EXPECT_THAT(refusalOfWriting(folder / name, Existing::Replace),
                    AllOf(HasSubstr(name), HasSubstr("cannot be written: it is write-protected")));
        }
        EXPECT_EQ(contentOf(folder / "late") + ", " + contentOf(folder / "early"), "of another program, replaced");
        EXPECT_EQ(folder.entryCount(), 4);
        ::_exit(testing::Test::HasFailure() ? 1 : 0);
    }

    TEST(OutputFileDeathTest, KeepsItsPromisesOnAllFileSystems)
    {
        TemporaryFolder const unnamed, named;
        EXPECT_EXIT(checkFolder(unnamed), testing::ExitedWithCode(0), "");
        EXPECT_EXIT(
            {
                if (!forbidUnnamedFiles())
                    ::_exit(0);
                {
                    OutputFile const out(named / "a");
                    EXPECT_EQ(named.entryCount(), 1); // so it has a name
                }
                checkFolder(named);
            },
            testing::ExitedWithCode(0), "");
    }

    TEST(OutputFileDeathTest, LeavesNothingIfTheProcessIsKilled)
    {
        TemporaryFolder const folder;
        EXPECT_EXIT(
            {
                OutputFile out(folder / "a.ply");
                out << std::string(1 << 20, 'x');
                std::raise(SIGKILL);
            },
            testing::KilledBySignal(SIGKILL), "");
        EXPECT_EQ(folder.entryCount(), 0);
    }

}

}
