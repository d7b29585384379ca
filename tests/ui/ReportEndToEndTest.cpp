// The create-layer report through our host and the module's ENTRYPOINT, on real image files: on a
// private X server driven from outside as a person would (keys), and without any display.
#include <gtest/gtest.h>

#include <sstream>

#include "Processes.h"
#include "config/SettingsConfigFile.h"
#include "lib/TestFiles.h"

namespace {

using namespace std::chrono_literals;
namespace fs = std::filesystem;
using vek::testing::readFile;

std::string quoted(const fs::path& p) { return "'" + p.string() + "'"; }

class ReportEndToEnd : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(runShell("convert -size 96x64 gradient:red-blue -depth 8 PNG24:" + quoted(input()) + " 2>&1"))
            << "imagemagick is needed";
    }

    fs::path input() const { return temp.path() / "in.png"; }
    fs::path settingsFile() const { return temp.path() / "config" / "Corvid" / "Quell 2 Common.conf"; }

    // The host's command line with the user folders in the temporary folder; display ":N" or none.
    std::string hostCommand(const std::string& display, const std::string& output, int dRes) const {
        std::ostringstream cmd;
        cmd << "cd " << quoted(temp.path()) << " && env -u WAYLAND_DISPLAY "
            << (display.empty() ? "-u DISPLAY " : "DISPLAY=" + display + " ") << "HOME=" << quoted(temp.path())
            << " XDG_CONFIG_HOME=" << quoted(temp.path() / "config") << " NO_AT_BRIDGE=1 ";
        cmd << quoted(NOCTIVA_HOST) << ' ' << quoted(input()) << " -o " << quoted(temp.path() / output)
            << " --dres " << dRes << " > " << quoted(temp.path() / (output + ".out")) << " 2> "
            << quoted(temp.path() / (output + ".err"));
        return cmd.str();
    }

    void expectProcessed(const std::string& output) const {
        const auto size = runShell("identify -format '%w x %h' " + quoted(temp.path() / output));
        ASSERT_TRUE(size) << output << " was not written";
        EXPECT_EQ(*size, "96 x 64");
    }

    std::string errors(const std::string& output) const { return readFile(temp.path() / (output + ".err")); }

    vek::testing::TempDir temp;
};

// The window with this exact title, waiting for it up to `timeout`; empty when none appears.
std::string findWindow(const std::string& display, const std::string& title, std::chrono::seconds timeout) {
    const auto end = std::chrono::steady_clock::now() + timeout;
    do {
        if (auto found = runShell("DISPLAY=" + display + " xdotool search --name '^" + title + "$' 2>/dev/null")) {
            std::istringstream ids(*found);
            std::string id;
            if (ids >> id) return id;
        }
        std::this_thread::sleep_for(100ms);
    } while (std::chrono::steady_clock::now() < end);
    return {};
}

bool keys(const std::string& display, const std::string& window, const std::string& sequence) {
    return runShell("DISPLAY=" + display + " xdotool windowfocus --sync " + window + " key --delay 150 " + sequence +
                    " 2>&1")
        .has_value();
}

TEST_F(ReportEndToEnd, TheDialogAppearsATickedBoxIsRememberedAndTheNextRunShowsNothing) {
    XvfbServer server;
    if (server.display().empty()) GTEST_SKIP() << "Xvfb could not be started";
    const std::string display = server.display();

    Background first(hostCommand(display, "first.png", 3));
    const std::string window = findWindow(display, "Warning", 30s);
    ASSERT_FALSE(window.empty()) << errors("first.png");
    EXPECT_TRUE(first.running()) << "the run must wait for the dialog";

    fs::create_directories(SCREENSHOT_DIR);
    const fs::path shot = fs::path(SCREENSHOT_DIR) / "create-layer-dialog.png";
    EXPECT_TRUE(runShell("DISPLAY=" + display + " import -window root " + quoted(shot)));
    EXPECT_TRUE(fs::exists(shot));

    // From OK (which has the focus) to the box, tick it, back to OK and press it.
    ASSERT_TRUE(keys(display, window, "Tab space shift+Tab Return"));
    ASSERT_EQ(first.wait(60s), 0) << errors("first.png");
    expectProcessed("first.png");
    EXPECT_NE(readFile(settingsFile()).find("ShowErrorCreateLayer=0"), std::string::npos) << readFile(settingsFile());

    Background second(hostCommand(display, "second.png", 3));
    bool appeared = false;
    while (second.running()) {
        appeared = appeared || !findWindow(display, "Warning", 0s).empty();
        std::this_thread::sleep_for(50ms);
    }
    EXPECT_EQ(second.wait(1s), 0) << errors("second.png");
    EXPECT_FALSE(appeared);
    expectProcessed("second.png");
    EXPECT_EQ(errors("second.png"), "");
}

TEST_F(ReportEndToEnd, ConfirmingWithoutTheBoxChangesNoSettingAndTheLanguageComesFromTheSettingsFile) {
    XvfbServer server;
    if (server.display().empty()) GTEST_SKIP() << "Xvfb could not be started";
    const std::string display = server.display();
    {
        vek::testing::ScopedUserFolders folders(temp.path());
        vek::SettingsConfigFile settings;
        ASSERT_TRUE(settings.setProperty("Language", "Language", "de"));
    }

    for (const char* run : {"one.png", "two.png"}) {
        Background host(hostCommand(display, run, 3));
        const std::string window = findWindow(display, "Warnung", 30s);
        ASSERT_FALSE(window.empty()) << errors(run);
        ASSERT_TRUE(keys(display, window, "Return"));
        ASSERT_EQ(host.wait(60s), 0) << errors(run);
        expectProcessed(run);
        EXPECT_EQ(readFile(settingsFile()).find("ShowErrorCreateLayer"), std::string::npos);
    }
}

TEST_F(ReportEndToEnd, WithoutADisplayTheMessageGoesToStandardErrorOnce) {
    Background host(hostCommand("", "headless.png", 3));
    ASSERT_EQ(host.wait(60s), 0) << errors("headless.png");
    expectProcessed("headless.png");
    const std::string err = errors("headless.png");
    const std::string text = "The layer for the result could not be created.";
    ASSERT_NE(err.find(text), std::string::npos) << err;
    EXPECT_EQ(err.find(text, err.find(text) + 1), std::string::npos) << err;
    EXPECT_NE(err.find("Warning"), std::string::npos) << err;
    EXPECT_FALSE(fs::exists(settingsFile()));

    // Turned off in the settings: not even the log line.
    vek::testing::writeFile(settingsFile(), "ShowErrorCreateLayer=0\n");
    Background again(hostCommand("", "headless2.png", 3));
    ASSERT_EQ(again.wait(60s), 0) << errors("headless2.png");
    expectProcessed("headless2.png");
    EXPECT_EQ(errors("headless2.png"), "");
}

TEST_F(ReportEndToEnd, OtherDResValuesReportNothing) {
    for (int dRes : {0, 2, 4}) {
        const std::string output = "plain" + std::to_string(dRes) + ".png";
        Background host(hostCommand("", output, dRes));
        ASSERT_EQ(host.wait(60s), 0) << errors(output);
        expectProcessed(output);
        EXPECT_EQ(errors(output), "") << dRes;
    }
}

}  // namespace
