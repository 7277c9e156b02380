// Temporary instance directories for tests, and running the built program
// against them.
#pragma once

#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <vector>

namespace mtrktest {

// A fresh instance directory under the system's temporary directory, with
// the tests' own small catalogs in msg/ (so that outputs show exactly what
// the program composed). Removed again when the object goes.
class TempInstance {
public:
    explicit TempInstance(bool testCatalogs = true);
    ~TempInstance();
    TempInstance(const TempInstance&) = delete;
    TempInstance& operator=(const TempInstance&) = delete;

    const std::filesystem::path& dir() const { return dir_; }
    void writeJson(const std::string& json) const { writeFile("instance.json", json); }
    void writeFile(const std::string& relative, const std::string& content) const;
    // The file's content, or "" when it does not exist.
    std::string readFile(const std::string& relative) const;
    std::string diagLog() const { return readFile("diag.log"); }
    std::string traceLog() const { return readFile("trace.log"); }
    std::string registry() const { return readFile("registry"); }
    // Points this process's engine (VRX_INSTANCE_DIR) at the directory.
    void activate() const;

private:
    std::filesystem::path dir_;
};

struct RunResult {
    int exitStatus = -1;  // 0..255 when the process exited
    int signal = 0;       // the signal that ended it, else 0
    std::string out;      // standard output
    std::string err;      // standard error
};

struct RunOptions {
    std::map<std::string, std::string> env;  // added to (or replacing) the environment
    double timeoutSeconds = 30;
    // Called with the child's pid once the first output byte has arrived
    // (for sending signals); the run then goes on to the end.
    std::function<void(int pid)> onFirstOutput;
};

// Runs the built vrxmtrk with `args` against `instance`.
RunResult runProgram(const TempInstance& instance, const std::vector<std::string>& args,
                     const RunOptions& options = {});

// The path of the built program.
std::string programPath();

// Captures what the calling process writes to standard output while `body`
// runs (stdout is flushed before and after).
std::string captureStdout(const std::function<void()>& body);

}  // namespace mtrktest
