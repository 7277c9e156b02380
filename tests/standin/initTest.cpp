// Setting up the client environment: the instance must be there and valid,
// and what is wrong with it is said in its own log.
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <regex>
#include <string>

#include "engine/vrxapp.h"
#include "testInstance.h"

namespace {

namespace fs = std::filesystem;

class InitTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.activate(); }
    void TearDown() override { unsetenv("VRX_INSTANCE_DIR"); }

    int32_t init() { return sqleInitApplicationEnvironment(0, 0, 1, nullptr); }

    // The text of the only record in diag.log, which must be one the engine
    // wrote about itself at `probe`.
    std::string onlyEngineRecord(int probe) {
        std::string log = instance_.diagLog();
        std::smatch m;
        std::regex record("\\S+ pid=\\d+ func=0x00000000 probe=" + std::to_string(probe) +
                          "\n  data#1 text\\(\\d+\\): \"(.*)\"\n\n");
        if (!std::regex_match(log, m, record))
            return "unexpected log: " + log;
        return m[1];
    }

    mtrktest::TempInstance instance_{false};
};

// (The configured result is answered in the end-to-end runs and sweeps.)
TEST_F(InitTest, AValidInstanceIsReady) {
    sqlca ca;
    std::memset(&ca, 0x55, sizeof ca);
    EXPECT_EQ(sqleInitApplicationEnvironment(0, 0, 1, &ca), 0);
    EXPECT_EQ(ca.sqlcode, 0);
    instance_.writeJson(R"({"state": "stopped", "pools": [{"name": "monh", "current": 1}]})");
    EXPECT_EQ(init(), 0);
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(InitTest, InvalidOrMissingInstanceFilesFailWithTheReason) {
    const std::pair<const char*, const char*> cases[] = {
        {R"({"databases": [{"name": "A"}, {"pools": [{"id": 1, "curent": 5}]}]})",
         R"(instance.json: databases[1].pools[0]: unknown key \"curent\")"},
        // A configured result does not hide a mistake elsewhere in the file.
        {"{\n  \"faults\": {\"initApplicationEnvironment\": 5}\n  \"pools\": []\n}",
         R"(instance.json: line 3, column 9: syntax error while parsing object - unexpected string literal; expected '}')"},
        {nullptr, "instance.json cannot be opened: No such file or directory"},
    };
    for (const auto& [json, record] : cases) {
        fs::remove(instance_.dir() / "diag.log");
        if (json != nullptr) {
            instance_.writeJson(json);
        } else {
            fs::remove(instance_.dir() / "instance.json");
        }
        EXPECT_NE(init(), 0) << record;
        EXPECT_EQ(onlyEngineRecord(20), record);
    }
}

TEST_F(InitTest, AMissingOrWrongDirectoryFails) {
    setenv("VRX_INSTANCE_DIR", (instance_.dir() / "nothing").c_str(), 1);
    EXPECT_NE(init(), 0);
    EXPECT_FALSE(fs::exists(instance_.dir() / "nothing"));

    instance_.writeFile("plain", "x");
    setenv("VRX_INSTANCE_DIR", (instance_.dir() / "plain").c_str(), 1);
    EXPECT_NE(init(), 0);
}

// Permissions do not bind the superuser, so a test run as root checks
// this as an unprivileged user in a child process.
TEST_F(InitTest, AnUnreadableDirectoryFailsAndSaysSo) {
    constexpr uid_t kNobody = 65534;
    bool asRoot = geteuid() == 0;
    if (asRoot) {
        ASSERT_EQ(chown(instance_.dir().c_str(), kNobody, kNobody), 0);
    }
    fs::permissions(instance_.dir(), fs::perms::owner_write | fs::perms::owner_exec);
    int32_t rc = 0;
    if (asRoot) {
        pid_t pid = fork();
        ASSERT_GE(pid, 0);
        if (pid == 0) {
            if (setgid(kNobody) != 0 || setuid(kNobody) != 0)
                _exit(2);
            _exit(init() != 0 ? 1 : 0);
        }
        int status = 0;
        waitpid(pid, &status, 0);
        ASSERT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) != 2) << "could not drop privileges";
        rc = WEXITSTATUS(status);
    } else {
        rc = init();
    }
    fs::permissions(instance_.dir(), fs::perms::owner_all);
    EXPECT_NE(rc, 0);
    EXPECT_EQ(onlyEngineRecord(10),
              "instance directory " + instance_.dir().string() + ": Permission denied");
}

}  // namespace
