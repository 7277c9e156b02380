#include "childProcess.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <vector>

extern char** environ;

namespace mtrktest {

ChildResult runChildTests(const std::string& filter,
                          const std::map<std::string, std::string>& env) {
    std::map<std::string, std::string> merged;
    for (char** e = environ; *e != nullptr; ++e) {
        std::string entry = *e;
        auto eq = entry.find('=');
        if (eq != std::string::npos)
            merged[entry.substr(0, eq)] = entry.substr(eq + 1);
    }
    for (const auto& [key, value] : env)
        merged[key] = value;
    merged["VRX_STANDIN_CHILD"] = "1";
    std::vector<std::string> envStrings;
    for (const auto& [key, value] : merged)
        envStrings.push_back(key + "=" + value);
    std::vector<char*> envp;
    for (auto& s : envStrings)
        envp.push_back(s.data());
    envp.push_back(nullptr);

    std::string self = "/proc/self/exe";
    std::string filterArg = "--gtest_filter=" + filter;
    std::vector<char*> argv{self.data(), filterArg.data(), nullptr};
    ChildResult result;
    int out[2];
    if (pipe(out) != 0)
        return result;
    pid_t pid = fork();
    if (pid < 0)
        return result;
    if (pid == 0) {
        dup2(out[1], 1);
        dup2(out[1], 2);
        close(out[0]);
        close(out[1]);
        execve(self.c_str(), argv.data(), envp.data());
        _exit(127);
    }
    close(out[1]);
    char buffer[4096];
    ssize_t n;
    while ((n = read(out[0], buffer, sizeof buffer)) > 0)
        result.output.append(buffer, n);
    close(out[0]);
    int status = 0;
    if (waitpid(pid, &status, 0) == pid && WIFEXITED(status))
        result.status = WEXITSTATUS(status);
    return result;
}

::testing::AssertionResult childTestPassed(const std::string& name,
                                           const std::map<std::string, std::string>& env) {
    ChildResult result = runChildTests(name, env);
    if (result.status != 0 || result.output.find("[       OK ] " + name) == std::string::npos) {
        return ::testing::AssertionFailure()
               << "child test " << name << " exited with " << result.status << ":\n"
               << result.output;
    }
    return ::testing::AssertionSuccess();
}

bool inChildProcess() {
    const char* child = std::getenv("VRX_STANDIN_CHILD");
    return child != nullptr && child[0] == '1';
}

}  // namespace mtrktest
