// Signals that end a run: whatever ends it, the registry variable holds
// afterwards what it held before, and the process ends by that signal.
#include <gtest/gtest.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <cstring>
#include <optional>
#include <random>
#include <string>
#include <thread>

#include "registryFile.h"
#include "testInstance.h"

namespace {

using mtrktest::registryValue;

constexpr const char* kClock = R"({"clock": "2026-12-06 20:05:39", "traceFlags": 131})";
const std::string kFirstRepetition = "time [2026/12/06] [20:05:39]\n\nno databases\n\n";

class SignalsTest : public ::testing::Test {
  protected:
    void SetUp() override {
        instance_.writeJson(kClock);
        instance_.writeFile("registry", "VRXMEMTRK=keep\n");
    }

    std::optional<std::string> memTrk() const { return registryValue(instance_.registry()); }
    bool traced(const char* functionId) const {
        return instance_.traceLog().find(std::string("entry ") + functionId) != std::string::npos;
    }

    // Runs a long -r run and sends `signalNumber` once its first repetition
    // has been written.
    mtrktest::RunResult interruptAfterFirstOutput(int signalNumber, bool allPools) {
        mtrktest::RunOptions options;
        options.onFirstOutput = [signalNumber](int pid) { kill(pid, signalNumber); };
        std::vector<std::string> args{"-d", "-r", "1", "100"};
        if (allPools)
            args.insert(args.begin(), "-all");
        return mtrktest::runProgram(instance_, args, options);
    }

    // Runs a shell script with the program's path and the instance in its
    // environment and SIGPIPE at its default; the script's exit status.
    int runScript(const std::string& script) {
        instance_.writeFile("script.sh", script);
        const std::string command = "VRXMTRK='" + mtrktest::programPath() + "' VRX_INSTANCE_DIR='" +
                                    instance_.dir().string() + "' bash '" +
                                    (instance_.dir() / "script.sh").string() + "'";
        auto previous = signal(SIGPIPE, SIG_DFL);
        const int status = std::system(command.c_str());
        signal(SIGPIPE, previous);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    size_t countLines(const std::string& line) const {
        const std::string log = instance_.traceLog();
        size_t count = 0;
        for (size_t at = log.find(line + "\n"); at != std::string::npos;
             at = log.find(line + "\n", at + 1)) {
            ++count;
        }
        return count;
    }

    mtrktest::TempInstance instance_;
};

TEST_F(SignalsTest, EndingSignalsRestoreTheRegistry) {
    for (int signalNumber : {SIGINT, SIGTERM, SIGHUP}) {
        SCOPED_TRACE(strsignal(signalNumber));
        instance_.writeFile("trace.log", "");
        const auto r = interruptAfterFirstOutput(signalNumber, true);
        EXPECT_EQ(r.signal, signalNumber);
        EXPECT_EQ(r.out, kFirstRepetition) << "no final failure report";
        EXPECT_EQ(memTrk(), "keep");
        EXPECT_TRUE(traced("0x187801d5"));
    }
}

TEST_F(SignalsTest, WithoutAllTheRegistryIsNotTouched) {
    const auto r = interruptAfterFirstOutput(SIGINT, false);
    EXPECT_EQ(r.signal, SIGINT);
    EXPECT_EQ(r.out, kFirstRepetition);
    EXPECT_EQ(memTrk(), "keep");
    EXPECT_FALSE(traced("0x187800be"));
    EXPECT_FALSE(traced("0x187801d5"));
}

TEST_F(SignalsTest, ClosedOutputPipeEndsTheRunBySigpipe) {
    const int status = runScript(
        "\"$VRXMTRK\" -all -d -r 1 100 | head -c 1 >/dev/null\n"
        "exit ${PIPESTATUS[0]}\n");
    EXPECT_EQ(status, 128 + SIGPIPE);
    EXPECT_EQ(memTrk(), "keep");
    EXPECT_TRUE(traced("0x187801d5"));
}

TEST_F(SignalsTest, IgnoredSigpipeEndsTheRunThroughTheFailedWrite) {
    // As under a caller that ignores SIGPIPE: the write fails instead, and
    // the run ends with its failure status after a normal shutdown.
    const int status = runScript(
        "trap '' PIPE\n"
        "\"$VRXMTRK\" -all -d -r 1 100 | head -c 1 >/dev/null\n"
        "exit ${PIPESTATUS[0]}\n");
    EXPECT_EQ(status, 252);
    EXPECT_EQ(memTrk(), "keep");
    EXPECT_NE(instance_.diagLog().find("Error in call to fflush."), std::string::npos);
}

TEST_F(SignalsTest, RepeatedInterruptsNeverLeaveTheVariableSet) {
    constexpr int kRuns = 100;
    int interrupted = 0;
    for (int i = 0; i < kRuns; ++i) {
        const auto r = interruptAfterFirstOutput(SIGINT, true);
        if (r.signal == SIGINT)
            ++interrupted;
        ASSERT_EQ(memTrk(), "keep") << "run " << i;
    }
    EXPECT_EQ(interrupted, kRuns);
    RecordProperty("interruptedRuns", interrupted);
}

// Starts the program with its output discarded and sends SIGINT after
// `delay`, wherever the run then is: before the handler is installed, in
// the middle of the exposure, in the report loop or in the shutdown. The
// signal that ended it, or 0 when it exited first.
int interruptAfter(const mtrktest::TempInstance& instance, bool repeat,
                   std::chrono::microseconds delay) {
    const std::string program = mtrktest::programPath();
    const pid_t pid = fork();
    if (pid == 0) {
        const int devNull = open("/dev/null", O_RDWR);
        dup2(devNull, 1);
        dup2(devNull, 2);
        sigset_t none;
        sigemptyset(&none);
        sigprocmask(SIG_SETMASK, &none, nullptr);
        signal(SIGINT, SIG_DFL);
        setenv("VRX_INSTANCE_DIR", instance.dir().c_str(), 1);
        if (repeat) {
            execl(program.c_str(), program.c_str(), "-all", "-d", "-r", "1", "100", nullptr);
        } else {
            execl(program.c_str(), program.c_str(), "-all", "-d", nullptr);
        }
        _exit(127);
    }
    std::this_thread::sleep_for(delay);
    // Until it is waited for, the pid stays the child's, even after its end.
    kill(pid, SIGINT);
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
}

TEST_F(SignalsTest, InterruptsAtAnyMomentNeverLeaveTheVariableSet) {
    // How long a whole run takes, to spread the signals over it and beyond.
    const auto start = std::chrono::steady_clock::now();
    const auto once = mtrktest::runProgram(instance_, {"-all", "-d"});
    ASSERT_EQ(once.exitStatus, 0);
    const auto span = std::chrono::duration_cast<std::chrono::microseconds>(
        std::chrono::steady_clock::now() - start);

    // Every other run is a single repetition that reaches its shutdown.
    constexpr int kRuns = 150;
    std::mt19937 random(12345);
    std::uniform_int_distribution<long> delay(0, span.count() + span.count() / 2);
    int interrupted = 0;
    for (int i = 0; i < kRuns; ++i) {
        const bool repeat = i % 2 == 0;
        const int ended =
            interruptAfter(instance_, repeat, std::chrono::microseconds(delay(random)));
        if (ended == SIGINT) {
            ++interrupted;
        }
        if (repeat) {
            EXPECT_EQ(ended, SIGINT) << "run " << i;
        }
        ASSERT_EQ(memTrk(), "keep") << "run " << i;
    }
    // Every run that got as far as setting the variable restored it.
    const size_t exposures = countLines("entry 0x187800be");
    EXPECT_EQ(countLines("entry 0x187801d5"), exposures);
    RecordProperty("interruptedRuns", interrupted);
    RecordProperty("runsThatSetTheVariable", static_cast<int>(exposures));
}

}  // namespace
