// Setting up the client environment: the engine checks that its instance is
// there and that instance.json describes it validly before any other call.
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "app/instanceView.h"
#include "common/diagLog.h"
#include "common/export.h"
#include "common/instance.h"
#include "engine/vrxapp.h"

namespace {

// Results of a failed set-up.
constexpr int32_t kInitNoInstance =
    static_cast<int32_t>(0x870F0201);  // directory missing or unreadable
constexpr int32_t kInitBadInstance =
    static_cast<int32_t>(0x870F0202);  // instance.json missing or invalid

// Probe points of the engine's own records about its set-up.
constexpr uint32_t kProbeDirectory = 10;
constexpr uint32_t kProbeInstanceFile = 20;

int32_t checkDirectory(const std::filesystem::path& dir) {
    // Neither VRX_INSTANCE_DIR nor the built-in demo: there is no log to
    // write to either.
    if (dir.empty())
        return kInitNoInstance;
    struct stat st {};
    const char* problem;
    if (stat(dir.c_str(), &st) != 0 ||
        (S_ISDIR(st.st_mode) && access(dir.c_str(), R_OK | X_OK) != 0)) {
        problem = std::strerror(errno);
    } else if (!S_ISDIR(st.st_mode)) {
        problem = "not a directory";
    } else {
        return 0;
    }
    // Written only where the directory itself still takes a log.
    standin::logEngineProblem("instance directory " + dir.string() + ": " + problem,
                              kProbeDirectory);
    return kInitNoInstance;
}

}  // namespace

extern "C" VRX_EXPORT int32_t sqleInitApplicationEnvironment(uint32_t /*reserved1*/,
                                                             uint32_t /*reserved2*/,
                                                             uint32_t /*mode*/, sqlca* ca) {
    if (ca != nullptr) {
        std::memset(ca, 0, sizeof *ca);
        std::memcpy(ca->sqlcaid, "SQLCA   ", sizeof ca->sqlcaid);
        ca->sqlcabc = sizeof *ca;
    }
    std::filesystem::path dir = standin::instanceDirectory();
    int32_t result = checkDirectory(dir);
    if (result == 0) {
        // The read that checks the file also gives the snapshot monitor its
        // first view of the instance.
        auto view = standin::instanceView(dir.string());
        if (!view->valid) {
            standin::logEngineProblem(view->error, kProbeInstanceFile);
            result = kInitBadInstance;
        } else if (view->settings.faults.initApplicationEnvironment) {
            result = *view->settings.faults.initApplicationEnvironment;
        }
    }
    if (ca != nullptr && result != 0)
        ca->sqlcode = SQLC_UNEXPECTED_FAILURE;
    return result;
}
