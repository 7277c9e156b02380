// The trace probes write one line each to trace.log. The program calls them
// from its signal handler as well, so they use stack buffers and plain
// system calls only, and leave errno as they found it.
#include <fcntl.h>
#include <limits.h>
#include <unistd.h>

#include <cerrno>

#include "common/export.h"
#include "common/fixedText.h"
#include "common/instance.h"
#include "engine/vrxsys.h"

namespace {

void appendTraceLine(const char* kind, uint32_t functionId, const int64_t* result) {
    int savedErrno = errno;
    char dir[PATH_MAX];
    char path[PATH_MAX + 16];
    standin::FixedText file(path, sizeof path);
    if (standin::instanceDirectoryPath(dir, sizeof dir) &&
        !file.add(dir).add("/trace.log").overflow()) {
        char buffer[64];
        standin::FixedText line(buffer, sizeof buffer);
        line.add(kind).add(" 0x").addHex32(functionId);
        if (result != nullptr)
            line.add(" rc=").addSigned(*result);
        line.addChar('\n');
        int fd = open(path, O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0644);
        if (fd >= 0) {
            ssize_t written;
            do {
                written = write(fd, line.text(), line.length());
            } while (written < 0 && errno == EINTR);
            close(fd);
        }
    }
    errno = savedErrno;
}

}  // namespace

extern "C" VRX_EXPORT void pdtEntry(uint32_t functionId) {
    appendTraceLine("entry", functionId, nullptr);
}

// A null result pointer gives a line without "rc=": there is nothing to show.
extern "C" VRX_EXPORT void pdtExit(uint32_t functionId, const int64_t* result,
                                   uint64_t /*reserved*/) {
    appendTraceLine("exit", functionId, result);
}

extern "C" VRX_EXPORT void pdFlightRecordTrc(uint32_t functionId, int64_t result,
                                             uint64_t /*reserved1*/, uint64_t /*reserved2*/) {
    appendTraceLine("flight", functionId, &result);
}
