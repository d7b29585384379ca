#include <gtest/gtest.h>

#include <filesystem>

#include "config/SettingsConfigFile.h"
#include "lib/TestFiles.h"
#include "lib/debug/LogCapture.h"

namespace {

namespace fs = std::filesystem;
using vek::SettingsConfigFile;
using vek::testing::readFile;
using vek::testing::ScopedEnv;
using vek::testing::TempDir;
using vek::text::FastString;

// Points the preferences folder at a fresh temporary folder for one test.
struct SettingsHome {
    TempDir dir;
    ScopedEnv xdg{"XDG_CONFIG_HOME", dir.path().c_str()};
    fs::path folder() const { return dir / "Corvid" / "Quell 2"; }
    fs::path file() const { return folder() / "Quell2.cfg"; }
    size_t entries() const {
        return static_cast<size_t>(std::distance(fs::directory_iterator(folder()), fs::directory_iterator()));
    }
};

TEST(SettingsConfigFile, CreatesFolderAndEmptyFileThenKeepsChanges) {
    SettingsHome home;
    {
        SettingsConfigFile settings;
        EXPECT_EQ(settings.getConfigurationFileName(), home.file().string());
        ASSERT_TRUE(fs::is_regular_file(home.file()));
        EXPECT_EQ(readFile(home.file()), "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<configuration/>\n");
        settings.setProperty("General", "Language", "de");
    }
    SettingsConfigFile again;
    EXPECT_EQ(again.getPropertyAsString("General", "Language"), "de");
    EXPECT_EQ(home.entries(), 1u);
}

TEST(SettingsConfigFile, AFailedSaveKeepsThePreviousFile) {
    SettingsHome home;
    {
        SettingsConfigFile settings;
        settings.setProperty("General", "Language", "de");
    }
    const std::string saved = readFile(home.file());
    vek::debug::LogCapture log;
    {
        // The disk fills up while the save at destruction writes its temporary file.
        vek::testing::ScopedFileSizeLimit fullDisk(saved.size() + 100);
        SettingsConfigFile settings;
        settings.setProperty("General", "Language", "it");
        settings.setProperty("General", "Padding", FastString(std::string(1u << 20, 'x')));
    }
    ASSERT_EQ(log.warnings().size(), 1u);
    EXPECT_EQ(log.warnings()[0].rfind("Could not save configuration XML file '" + home.file().string() + "'!", 0), 0u);
    EXPECT_EQ(readFile(home.file()), saved);
    EXPECT_EQ(home.entries(), 1u);  // the partial temporary file is gone
    SettingsConfigFile after;
    EXPECT_EQ(after.getPropertyAsString("General", "Language"), "de");
}

TEST(SettingsConfigFile, AnUnreadableFileIsNotOverwritten) {
    SettingsHome home;
    const std::string damaged = "<configuration><group name=\"General\"><key name=\"Lang";
    vek::testing::writeFile(home.file(), damaged);
    {
        vek::debug::LogCapture quiet;
        SettingsConfigFile settings;
        EXPECT_TRUE(settings.getConfigurationFileName().empty());
        settings.setProperty("General", "Language", "de");
    }
    EXPECT_EQ(readFile(home.file()), damaged);
}

TEST(SettingsConfigFile, RetriesCreatingTheFileWhenTheFolderWasInTheWay) {
    SettingsHome home;
    // A plain file where the folder "Corvid" belongs.
    vek::testing::writeFile(home.dir / "Corvid", "in the way");
    {
        vek::debug::LogCapture quiet;
        SettingsConfigFile settings;
        EXPECT_TRUE(settings.getConfigurationFileName().empty());
        settings.setProperty("General", "Language", "de");
        fs::remove(home.dir / "Corvid");
    }
    SettingsConfigFile again;
    EXPECT_EQ(again.getPropertyAsString("General", "Language"), "de");
}

}  // namespace
