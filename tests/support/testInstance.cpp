#include "testInstance.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <stdexcept>

extern char** environ;
// Kept by the stand-in's system services library (see standin/common/instance.h).
extern "C" void vrxStandinNoteInstanceRequest(void);

namespace mtrktest {

namespace fs = std::filesystem;

TempInstance::TempInstance(bool testCatalogs) {
    std::string pattern = (fs::temp_directory_path() / "vrxmtrk-test-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr)
        throw std::runtime_error("mkdtemp failed");
    dir_ = pattern;
    writeJson("{}");
    if (testCatalogs) {
        fs::create_directories(dir_ / "msg");
        for (const char* name : {"vrxmtrk.mo", "vrxsql.mo"}) {
            fs::copy_file(fs::path(VRX_TEST_CATALOG_DIR) / name, dir_ / "msg" / name);
        }
    }
}

TempInstance::~TempInstance() {
    std::error_code ec;
    fs::remove_all(dir_, ec);
}

void TempInstance::writeFile(const std::string& relative, const std::string& content) const {
    fs::path p = dir_ / relative;
    fs::create_directories(p.parent_path());
    std::ofstream f(p, std::ios::binary | std::ios::trunc);
    f << content;
    if (!f)
        throw std::runtime_error("cannot write " + p.string());
    f.close();
    // The engine's services in this process look at their files again after
    // the client library's next request; an edit stands for one, as the
    // next snapshot of a running program would.
    vrxStandinNoteInstanceRequest();
}

std::string TempInstance::readFile(const std::string& relative) const {
    std::ifstream f(dir_ / relative, std::ios::binary);
    if (!f)
        return {};
    std::ostringstream s;
    s << f.rdbuf();
    return s.str();
}

void TempInstance::activate() const {
    setenv("VRX_INSTANCE_DIR", dir_.c_str(), 1);
}

std::string programPath() {
    return VRX_PROGRAM;
}

RunResult runProgram(const TempInstance& instance, const std::vector<std::string>& args,
                     const RunOptions& options) {
    int outPipe[2];
    int errPipe[2];
    if (pipe(outPipe) != 0 || pipe(errPipe) != 0)
        throw std::runtime_error("pipe failed");

    std::map<std::string, std::string> env;
    for (char** e = environ; *e != nullptr; ++e) {
        std::string kv = *e;
        auto eq = kv.find('=');
        if (eq != std::string::npos)
            env[kv.substr(0, eq)] = kv.substr(eq + 1);
    }
    env["VRX_INSTANCE_DIR"] = instance.dir().string();
    for (const auto& [k, v] : options.env)
        env[k] = v;
    std::vector<std::string> envStrings;
    for (const auto& [k, v] : env)
        envStrings.push_back(k + "=" + v);
    std::vector<char*> envp;
    for (auto& s : envStrings)
        envp.push_back(s.data());
    envp.push_back(nullptr);

    std::string program = programPath();
    std::vector<std::string> argStrings{program};
    argStrings.insert(argStrings.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (auto& s : argStrings)
        argv.push_back(s.data());
    argv.push_back(nullptr);

    pid_t pid = fork();
    if (pid < 0)
        throw std::runtime_error("fork failed");
    if (pid == 0) {
        dup2(outPipe[1], 1);
        dup2(errPipe[1], 2);
        close(outPipe[0]);
        close(outPipe[1]);
        close(errPipe[0]);
        close(errPipe[1]);
        int devNull = open("/dev/null", O_RDONLY);
        if (devNull >= 0)
            dup2(devNull, 0);
        // A test runner may have signals ignored or blocked; the program
        // starts with the defaults, as from a shell.
        sigset_t none;
        sigemptyset(&none);
        sigprocmask(SIG_SETMASK, &none, nullptr);
        for (int s : {SIGINT, SIGTERM, SIGHUP, SIGPIPE})
            signal(s, SIG_DFL);
        execve(program.c_str(), argv.data(), envp.data());
        _exit(127);
    }
    close(outPipe[1]);
    close(errPipe[1]);

    RunResult result;
    bool notified = false;
    auto deadline = std::chrono::steady_clock::now() +
                    std::chrono::milliseconds(static_cast<long>(options.timeoutSeconds * 1000));
    pollfd fds[2] = {{outPipe[0], POLLIN, 0}, {errPipe[0], POLLIN, 0}};
    int open = 2;
    bool killed = false;
    while (open > 0) {
        auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
                        deadline - std::chrono::steady_clock::now())
                        .count();
        if (left <= 0) {
            kill(pid, SIGKILL);
            killed = true;
            break;
        }
        if (poll(fds, 2, static_cast<int>(left)) < 0)
            continue;
        for (auto& pfd : fds) {
            if (pfd.fd < 0 || (pfd.revents & (POLLIN | POLLHUP)) == 0)
                continue;
            char buf[65536];
            ssize_t n = read(pfd.fd, buf, sizeof buf);
            if (n <= 0) {
                close(pfd.fd);
                pfd.fd = -1;
                --open;
                continue;
            }
            (pfd.fd == outPipe[0] ? result.out : result.err).append(buf, static_cast<size_t>(n));
            if (!notified && pfd.fd == outPipe[0] && options.onFirstOutput) {
                notified = true;
                options.onFirstOutput(pid);
            }
        }
    }
    for (auto& pfd : fds) {
        if (pfd.fd >= 0)
            close(pfd.fd);
    }
    int status = 0;
    waitpid(pid, &status, 0);
    if (killed)
        throw std::runtime_error("vrxmtrk did not end within the time limit");
    if (WIFEXITED(status))
        result.exitStatus = WEXITSTATUS(status);
    if (WIFSIGNALED(status))
        result.signal = WTERMSIG(status);
    return result;
}

std::string captureStdout(const std::function<void()>& body) {
    std::fflush(stdout);
    char path[] = "/tmp/vrxmtrk-stdout-XXXXXX";
    int fd = mkstemp(path);
    if (fd < 0)
        throw std::runtime_error("mkstemp failed");
    int saved = dup(1);
    dup2(fd, 1);
    body();
    std::fflush(stdout);
    dup2(saved, 1);
    close(saved);
    std::string out;
    lseek(fd, 0, SEEK_SET);
    char buf[65536];
    ssize_t n;
    while ((n = read(fd, buf, sizeof buf)) > 0)
        out.append(buf, static_cast<size_t>(n));
    close(fd);
    unlink(path);
    return out;
}

}  // namespace mtrktest
