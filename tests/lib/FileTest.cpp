#include <gtest/gtest.h>

#include <sys/stat.h>

#include <filesystem>

#include "lib/TestFiles.h"
#include "lib/filesystem/AtomicFile.h"
#include "lib/filesystem/FileException.h"
#include "lib/filesystem/SpecialFolders.h"

namespace {

namespace fs = std::filesystem;
using vek::filesystem::FileException;
using vek::filesystem::writeFileAtomically;
using vek::testing::readFile;
using vek::testing::TempDir;

size_t entriesIn(const fs::path& dir) {
    return static_cast<size_t>(std::distance(fs::directory_iterator(dir), fs::directory_iterator()));
}

TEST(AtomicFile, ReplacesContentAndKeepsPermissions) {
    TempDir dir;
    const fs::path file = dir / "a.cfg";
    writeFileAtomically(file, "first", false);
    EXPECT_EQ(readFile(file), "first");
    ::chmod(file.c_str(), 0600);
    writeFileAtomically(file, "second, longer", false);
    EXPECT_EQ(readFile(file), "second, longer");
    writeFileAtomically(file, "", false);
    EXPECT_EQ(readFile(file), "");
    EXPECT_EQ(fs::status(file).permissions() & fs::perms::all, fs::perms::owner_read | fs::perms::owner_write);
    EXPECT_EQ(entriesIn(dir.path()), 1u);  // no temporary file left behind
}

TEST(AtomicFile, CreatesFoldersOnlyWhenAsked) {
    TempDir dir;
    EXPECT_THROW(writeFileAtomically(dir / "x" / "y" / "a.cfg", "c", false), FileException);
    writeFileAtomically(dir / "x" / "y" / "a.cfg", "c", true);
    EXPECT_EQ(readFile(dir / "x" / "y" / "a.cfg"), "c");
}

TEST(ReadWholeFile, RefusesWhatIsNotAReadableRegularFileOfSaneSize) {
    TempDir dir;
    using vek::filesystem::readWholeFile;
    EXPECT_THROW(readWholeFile(dir / "missing", 100), FileException);
    EXPECT_THROW(readWholeFile(dir.path(), 100), FileException);
    vek::testing::writeFile(dir / "big", std::string(101, 'b'));
    EXPECT_THROW(readWholeFile(dir / "big", 100), FileException);
    EXPECT_EQ(readWholeFile(dir / "big", 101).size(), 101u);
    ::mkfifo((dir / "fifo").c_str(), 0600);
    EXPECT_THROW(readWholeFile(dir / "fifo", 100), FileException);  // would block forever if opened
}

TEST(SpecialFolders, FollowsXdgConfigHomeAndFallsBackToHome) {
    using vek::filesystem::SpecialFolders;
    vek::testing::ScopedEnv home("HOME", "/home/someone");
    {
        vek::testing::ScopedEnv xdg("XDG_CONFIG_HOME", "/elsewhere/config");
        EXPECT_EQ(SpecialFolders::userPreferences(), fs::path("/elsewhere/config"));
    }
    {
        vek::testing::ScopedEnv xdg("XDG_CONFIG_HOME", "relative/ignored");
        EXPECT_EQ(SpecialFolders::userPreferences(), fs::path("/home/someone/.config"));
    }
    vek::testing::ScopedEnv xdg("XDG_CONFIG_HOME", nullptr);
    EXPECT_EQ(SpecialFolders::userPreferences(), fs::path("/home/someone/.config"));
}

}  // namespace
