// The progress bar as a person sees it: the command on a pseudo-terminal.
#include <gtest/gtest.h>
#include <pty.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <regex>

#include "CommandSupport.h"
#include "host/TestSupport.h"
#include "noctiva/host/ImageFile.h"

namespace fs = std::filesystem;
using clitest::q;

namespace {

struct TerminalRun {
    int status = -1;
    std::string screen;  // stdout and stderr together, as the terminal received them
};

TerminalRun runOnTerminal(const std::vector<std::string>& arguments) {
    std::vector<char*> argv;
    std::string program = NOCTIVA_COMMAND_PATH;
    argv.push_back(program.data());
    std::vector<std::string> copies = arguments;
    for (std::string& a : copies) argv.push_back(a.data());
    argv.push_back(nullptr);

    int master = -1;
    const pid_t child = forkpty(&master, nullptr, nullptr, nullptr);
    if (child == 0) {
        execv(argv[0], argv.data());
        _exit(127);
    }
    TerminalRun result;
    if (child < 0) return result;
    char buffer[4096];
    for (;;) {
        const ssize_t n = read(master, buffer, sizeof buffer);
        if (n > 0) {
            result.screen.append(buffer, std::size_t(n));
        } else if (n < 0 && errno == EINTR) {
            continue;
        } else {
            break;  // EIO once the child has closed the terminal
        }
    }
    close(master);
    int status = 0;
    waitpid(child, &status, 0);
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return result;
}

std::vector<int> percentsShown(const std::string& screen) {
    std::vector<int> percents;
    const std::regex bar(R"(\r[^\r\n]*\[[#.]{30}\] +(\d+)%)");
    for (auto it = std::sregex_iterator(screen.begin(), screen.end(), bar); it != std::sregex_iterator(); ++it)
        percents.push_back(std::stoi((*it)[1]));
    return percents;
}

class ProgressOnTerminal : public ::testing::Test {
protected:
    void SetUp() override {
#ifndef NOCTIVA_MODULE_PATH
        GTEST_SKIP() << "the module was not built";
#else
        folder_ = hosttest::scratchFolder("pty");
        // 5 x 4 tiles of 200 x 200: the module reports progress after each.
        noctiva::host::saveImage(folder_ / "in.png", hosttest::patternImage(1000, 800, 3, 8),
                                 noctiva::host::FileFormat::Png);
#endif
    }
    std::vector<std::string> args(std::initializer_list<std::string> extra) const {
        std::vector<std::string> a{(folder_ / "in.png").string(), "-o", (folder_ / "out.png").string()};
#ifdef NOCTIVA_MODULE_PATH
        a.insert(a.end(), {"--module", NOCTIVA_MODULE_PATH});
#endif
        a.insert(a.end(), extra);
        return a;
    }
    fs::path folder_;
};

TEST_F(ProgressOnTerminal, BarAdvancesAndEndsWithTheSummary) {
    const TerminalRun r = runOnTerminal(args({}));
    ASSERT_EQ(r.status, 0) << r.screen;
    const std::vector<int> percents = percentsShown(r.screen);
    ASSERT_GE(percents.size(), 3u) << r.screen;
    EXPECT_TRUE(std::is_sorted(percents.begin(), percents.end())) << r.screen;
    EXPECT_LT(percents.front(), 100);
    EXPECT_EQ(percents.back(), 100);
    EXPECT_TRUE(std::regex_search(r.screen, std::regex(R"(in\.png done in \d+\.\d\d s, \d+\.\d\d megapixels/s)")))
        << r.screen;
    EXPECT_NE(r.screen.find("out.png: 1000 x 800, 8-bit RGB"), std::string::npos) << r.screen;
}

TEST_F(ProgressOnTerminal, NoProgressAndQuietKeepTheTerminalClean) {
    TerminalRun r = runOnTerminal(args({"--no-progress"}));
    ASSERT_EQ(r.status, 0) << r.screen;
    EXPECT_TRUE(percentsShown(r.screen).empty()) << r.screen;
    EXPECT_EQ(r.screen.find("done in"), std::string::npos);
    r = runOnTerminal(args({"--quiet"}));
    ASSERT_EQ(r.status, 0) << r.screen;
    EXPECT_EQ(r.screen, "");
}

TEST_F(ProgressOnTerminal, ProgressCanBeForcedWithoutTerminal) {
    std::string arguments;
    for (const std::string& a : args({"--progress"})) arguments += q(a) + " ";
    const clitest::Outcome o = clitest::run(arguments);
    ASSERT_EQ(o.status, 0) << o.err;
    EXPECT_FALSE(percentsShown(o.err).empty()) << o.err;
    EXPECT_NE(o.err.find("done in"), std::string::npos);
}

}  // namespace
