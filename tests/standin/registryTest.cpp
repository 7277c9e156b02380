// The profile registry through the engine's interface: round trips per
// partition, the "no value" answers, removal, atomic replacement, limits and
// the configured faults.
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <string>

#include "common/instance.h"
#include "common/registry.h"
#include "engine/vrxsys.h"
#include "testInstance.h"

namespace {

namespace fs = std::filesystem;

class RegistryTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.activate(); }
    void TearDown() override { unsetenv("VRX_INSTANCE_DIR"); }

    int32_t write(const char* name, const char* value, int32_t partition = -1) {
        return sqloPRegValuePE(SQLO_REG_WRITE, 0, name, const_cast<char*>(value), nullptr,
                               partition, 0);
    }
    // The read's answer and the value it left.
    std::pair<int32_t, std::string> read(const char* name, int32_t partition = -1) {
        char value[SQLO_REG_VALUE_MAX + 1];
        std::memset(value, 'x', sizeof value);
        int32_t rc = sqloPRegValuePE(SQLO_REG_READ, 0, name, value, nullptr, partition, 0);
        return {rc, std::string(value, strnlen(value, sizeof value))};
    }
    bool tempFilesLeft() const {
        for (const auto& entry : fs::directory_iterator(instance_.dir())) {
            if (entry.path().filename().string().rfind("registry.", 0) == 0)
                return true;
        }
        return false;
    }

    mtrktest::TempInstance instance_{false};
};

TEST_F(RegistryTest, ValuesRoundTripPerPartition) {
    EXPECT_EQ(read("VRXMEMTRK"), std::make_pair(SQLO_REG_NO_FILE, std::string()));
    EXPECT_EQ(write("VRXMEMTRK", "1"), 0);
    EXPECT_EQ(write("VRXMEMTRK", "zero", 0), 0);
    EXPECT_EQ(write("VRXMEMTRK", "three", 3), 0);
    EXPECT_EQ(write("OTHER", "a=b@c"), 0);
    EXPECT_EQ(instance_.registry(),
              "VRXMEMTRK=1\nVRXMEMTRK@0=zero\nVRXMEMTRK@3=three\nOTHER=a=b@c\n");
    EXPECT_EQ(read("VRXMEMTRK"), std::make_pair(0, std::string("1")));
    EXPECT_EQ(read("VRXMEMTRK", 0), std::make_pair(0, std::string("zero")));
    EXPECT_EQ(read("VRXMEMTRK", 3), std::make_pair(0, std::string("three")));
    EXPECT_EQ(read("VRXMEMTRK", 30), std::make_pair(SQLO_REG_NOT_SET, std::string()));
    EXPECT_EQ(read("VRXMEMTR"), std::make_pair(SQLO_REG_NOT_SET, std::string()));
    EXPECT_EQ(read("OTHER"), std::make_pair(0, std::string("a=b@c")));

    // Setting again replaces the line in place of appending a second one.
    EXPECT_EQ(write("VRXMEMTRK", "0"), 0);
    EXPECT_EQ(read("VRXMEMTRK"), std::make_pair(0, std::string("0")));
    EXPECT_EQ(instance_.registry(),
              "VRXMEMTRK@0=zero\nVRXMEMTRK@3=three\nOTHER=a=b@c\nVRXMEMTRK=0\n");
    EXPECT_FALSE(tempFilesLeft());
}

TEST_F(RegistryTest, TheEmptyTextRemovesTheLineAndTheLastLineTheFile) {
    EXPECT_EQ(write("VRXMEMTRK", ""), 0);  // nothing to remove, nothing created
    EXPECT_FALSE(fs::exists(instance_.dir() / "registry"));
    ASSERT_EQ(write("VRXMEMTRK", "1"), 0);
    ASSERT_EQ(write("KEEP", "yes", 2), 0);
    EXPECT_EQ(write("VRXMEMTRK", ""), 0);
    EXPECT_EQ(instance_.registry(), "KEEP@2=yes\n");
    EXPECT_EQ(read("VRXMEMTRK"), std::make_pair(SQLO_REG_NOT_SET, std::string()));
    EXPECT_EQ(write("KEEP", "", 2), 0);
    EXPECT_FALSE(fs::exists(instance_.dir() / "registry"));
    EXPECT_EQ(read("KEEP", 2).first, SQLO_REG_NO_FILE);
    EXPECT_FALSE(tempFilesLeft());
}

// Lines of other variables pass through as they stand, whatever they look
// like: longer than any buffer, resembling the name, without a final line
// feed, or not of the NAME=VALUE form at all.
TEST_F(RegistryTest, OtherLinesAreKeptByteForByte) {
    std::string longLine = "LONG=" + std::string(10000, 'v');
    std::string before = "# written by hand\n" + longLine +
                         "\nVRXMEMTRK2=a\nVRXMEMTRK@1=b\nXVRXMEMTRK=c\n\nVRXMEMTRK=old\nVRXMEM";
    instance_.writeFile("registry", before);
    EXPECT_EQ(read("VRXMEMTRK"), std::make_pair(0, std::string("old")));
    EXPECT_EQ(read("VRXMEM").first, SQLO_REG_NOT_SET);
    ASSERT_EQ(write("VRXMEMTRK", "new"), 0);
    EXPECT_EQ(instance_.registry(), "# written by hand\n" + longLine +
                                        "\nVRXMEMTRK2=a\nVRXMEMTRK@1=b\nXVRXMEMTRK=c\n\nVRXMEM\n"
                                        "VRXMEMTRK=new\n");
    ASSERT_EQ(write("VRXMEMTRK", ""), 0);
    EXPECT_EQ(instance_.registry(), "# written by hand\n" + longLine +
                                        "\nVRXMEMTRK2=a\nVRXMEMTRK@1=b\nXVRXMEMTRK=c\n\nVRXMEM\n");
    EXPECT_EQ(read("LONG").second, std::string(255, 'v'));
}

TEST_F(RegistryTest, ValuesHoldAtMost255Bytes) {
    std::string longest(255, 'a');
    ASSERT_EQ(write("V", longest.c_str()), 0);
    EXPECT_EQ(read("V"), std::make_pair(0, longest));
    std::string tooLong(256, 'b');
    EXPECT_EQ(write("V", tooLong.c_str()), standin::kRegistryValueTooLong);
    EXPECT_EQ(read("V").second, longest);

    // A longer value edited into the file is cut: the read never writes more
    // than 256 bytes, terminator included.
    instance_.writeFile("registry", "V=" + std::string(400, 'c') + "\n");
    char buffer[300];
    std::memset(buffer, '#', sizeof buffer);
    ASSERT_EQ(sqloPRegValuePE(SQLO_REG_READ, 0, "V", buffer, nullptr, -1, 0), 0);
    EXPECT_EQ(std::string(buffer), std::string(255, 'c'));
    EXPECT_EQ(buffer[256], '#');
}

TEST_F(RegistryTest, MalformedRequestsAreRefused) {
    EXPECT_EQ(write("A=B", "1"), standin::kRegistryBadArgument);
    EXPECT_EQ(write("A@1", "1"), standin::kRegistryBadArgument);
    EXPECT_EQ(write("", "1"), standin::kRegistryBadArgument);
    EXPECT_EQ(write("A", "two\nlines"), standin::kRegistryBadArgument);
    EXPECT_EQ(write("A", "1", -2), standin::kRegistryBadArgument);
    EXPECT_EQ(sqloPRegValuePE(5, 0, "A", nullptr, nullptr, -1, 0),
              static_cast<int32_t>(0x870F0100));
    EXPECT_FALSE(fs::exists(instance_.dir() / "registry"));
}

TEST_F(RegistryTest, InternalPoolsShowExactlyWhenPartitionMinusOneHoldsOne) {
    struct Case {
        const char* registry;
        bool exposed;
    };
    const Case cases[] = {
        {"", false},
        {"VRXMEMTRK=1\n", true},
        {"VRXMEMTRK=1", true},
        {"VRXMEMTRK=0\n", false},
        {"VRXMEMTRK=11\n", false},
        {"VRXMEMTRK= 1\n", false},
        {"VRXMEMTRK@0=1\n", false},
        {"A=0\nVRXMEMTRK=1\n", true},
        {"VRXMEMTRK=1\r\nB=2\r\n", true},  // a file edited with Windows line ends
    };
    for (const Case& c : cases) {
        instance_.writeFile("registry", c.registry);
        EXPECT_EQ(sqloShouldInternalPoolsBeExposed() != 0, c.exposed) << c.registry;
        EXPECT_EQ(standin::internalPoolsExposed(instance_.dir().c_str()), c.exposed) << c.registry;
    }
}

// A configured failure changes the answers of the registry service, and
// nothing else: the file stays as it was and the exposure check still
// reads it.
TEST_F(RegistryTest, FaultsChangeOnlyTheServiceAnswers) {
    ASSERT_EQ(write("VRXMEMTRK", "1"), 0);
    instance_.writeJson(R"({"faults": {"registryRead": 77, "registryWrite": "0x870F0109"}})");
    EXPECT_EQ(read("VRXMEMTRK").first, 77);
    EXPECT_EQ(write("VRXMEMTRK", ""), SQLO_REG_NO_VALUE);
    EXPECT_EQ(instance_.registry(), "VRXMEMTRK=1\n");
    EXPECT_TRUE(sqloShouldInternalPoolsBeExposed());

    instance_.writeJson(R"({"faults": {"registryWrite": 5}})");
    EXPECT_EQ(read("VRXMEMTRK"), std::make_pair(0, std::string("1")));
    EXPECT_EQ(write("VRXMEMTRK", "0"), 5);
    instance_.writeJson("{}");
    EXPECT_EQ(write("VRXMEMTRK", "0"), 0);
    EXPECT_EQ(instance_.registry(), "VRXMEMTRK=0\n");
}

// The write fault is looked up without loading instance.json when that file
// has not changed since the engine last loaded it, and a file that does not
// mention the fault needs no loading either.
TEST_F(RegistryTest, WriteFaultLookupFollowsTheFile) {
    const char* dir = instance_.dir().c_str();
    instance_.writeJson(R"({"faults": {"registryWrite": 12}})");
    EXPECT_EQ(standin::registryWriteFault(dir), 12);
    instance_.writeJson(R"({"faults": {"registryWrite": 13}})");
    EXPECT_EQ(standin::registryWriteFault(dir), 13);
    instance_.writeJson(R"({"state": "stopped"})");
    EXPECT_FALSE(standin::registryWriteFault(dir));
    mtrktest::TempInstance other(false);
    EXPECT_FALSE(standin::registryWriteFault(other.dir().c_str()));
}

// The new registry replaces the old one by rename: a reader holding the old
// file keeps seeing it whole, so a reader of the name sees either the old or
// the new content, never a mixture.
TEST_F(RegistryTest, ReplacementIsAtomic) {
    ASSERT_EQ(write("A", "1"), 0);
    fs::create_hard_link(instance_.dir() / "registry", instance_.dir() / "old");
    ASSERT_EQ(write("B", "2"), 0);
    EXPECT_EQ(instance_.readFile("old"), "A=1\n");
    EXPECT_EQ(instance_.registry(), "A=1\nB=2\n");
    EXPECT_FALSE(tempFilesLeft());

    // The new file keeps the old one's mode.
    fs::permissions(instance_.dir() / "registry", fs::perms::owner_read | fs::perms::owner_write);
    ASSERT_EQ(write("C", "3"), 0);
    EXPECT_EQ(fs::status(instance_.dir() / "registry").permissions() & fs::perms::all,
              fs::perms::owner_read | fs::perms::owner_write);
}

}  // namespace
