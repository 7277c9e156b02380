// Running parts of the stand-in's tests in a fresh process of this test
// program: what the engine does at load time and at exit, and what it counts
// per process, can only be seen from outside such a process.
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <string>

namespace mtrktest {

struct ChildResult {
    int status = -1;     // exit status (0: the tests passed), -1 when it did not exit
    std::string output;  // what the child wrote, for the failure message
};

// Runs the tests matching `filter` of this program in a new process with
// `env` added to the environment and VRX_STANDIN_CHILD set.
ChildResult runChildTests(const std::string& filter, const std::map<std::string, std::string>& env);

// Runs the one child test `name` (Suite.Test) and checks that it ran and
// passed: an empty filter match would otherwise pass silently.
::testing::AssertionResult childTestPassed(const std::string& name,
                                           const std::map<std::string, std::string>& env);

// True inside such a child: tests that only make sense there skip otherwise.
bool inChildProcess();

}  // namespace mtrktest

// A test that runs only inside a child started with runChildTests.
#define CHILD_ONLY()                      \
    do {                                  \
        if (!mtrktest::inChildProcess())  \
            GTEST_SKIP() << "child only"; \
    } while (0)
