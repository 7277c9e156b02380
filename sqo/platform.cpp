// The program's only POSIX code.
#include "platform.h"

#include <signal.h>
#include <time.h>

#include <cerrno>

namespace {

constexpr uint64_t MTRK_MS_PER_SECOND = 1000;
constexpr long MTRK_NS_PER_MS = 1000000;

// The mask in force before the last mtrkBlockRunSignals.
sigset_t gMaskBeforeBlock;

}  // namespace

void Sleep(uint64_t milliseconds) {
    timespec wanted{};
    wanted.tv_sec = static_cast<time_t>(milliseconds / MTRK_MS_PER_SECOND);
    wanted.tv_nsec = static_cast<long>(milliseconds % MTRK_MS_PER_SECOND) * MTRK_NS_PER_MS;
    timespec left{};
    // A handler that returns must not shorten the wait: go on with what is left.
    while (nanosleep(&wanted, &left) != 0 && errno == EINTR) {
        wanted = left;
    }
}

void mtrkBlockRunSignals(void) {
    sigset_t runSignals;
    sigemptyset(&runSignals);
    sigaddset(&runSignals, SIGINT);
    sigaddset(&runSignals, SIGTERM);
    sigaddset(&runSignals, SIGHUP);
    sigaddset(&runSignals, SIGPIPE);
    sigprocmask(SIG_BLOCK, &runSignals, &gMaskBeforeBlock);
}

void mtrkUnblockRunSignals(void) {
    sigprocmask(SIG_SETMASK, &gMaskBeforeBlock, nullptr);
}
