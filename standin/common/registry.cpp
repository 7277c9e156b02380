// Everything here may run inside a signal handler: stack buffers and plain
// system calls only.
#include "common/registry.h"

#include "common/fixedText.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>

namespace standin {

namespace {

constexpr size_t kKeyMax = 160;
constexpr size_t kPathMax = PATH_MAX + 64;

// "NAME=" or "NAME@P=": what a line of the variable starts with.
size_t buildKey(const char* name, int32_t partition, char* key) {
    if (name == nullptr || name[0] == '\0' || partition < -1)
        return 0;
    for (const char* c = name; *c != '\0'; ++c) {
        if (*c == '=' || *c == '@' || *c == '\n' || *c == '\r')
            return 0;
    }
    FixedText text(key, kKeyMax);
    text.add(name);
    if (partition >= 0)
        text.addChar('@').addDecimal(static_cast<uint64_t>(partition));
    text.addChar('=');
    return text.overflow() ? 0 : text.length();
}

bool buildPath(const char* dir, const char* file, char* path) {
    if (dir == nullptr || dir[0] == '\0')
        return false;
    FixedText text(path, kPathMax);
    text.add(dir).addChar('/').add(file);
    return !text.overflow();
}

ssize_t readSome(int fd, char* buffer, size_t size) {
    for (;;) {
        ssize_t n = read(fd, buffer, size);
        if (n >= 0 || errno != EINTR)
            return n;
    }
}

bool writeAll(int fd, const char* data, size_t size) {
    while (size > 0) {
        ssize_t n = write(fd, data, size);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return false;
        data += n;
        size -= static_cast<size_t>(n);
    }
    return true;
}

// Buffered output to the new registry file.
struct Output {
    explicit Output(int fd) : fd(fd) {}

    int fd;
    char buffer[4096];
    size_t used = 0;
    uint64_t total = 0;
    char last = '\n';
    bool failed = false;

    void put(char c) {
        if (used == sizeof buffer)
            flush();
        buffer[used++] = c;
        ++total;
        last = c;
    }
    void put(const char* text, size_t n) {
        for (size_t i = 0; i < n; ++i)
            put(text[i]);
    }
    void flush() {
        if (!failed && used > 0 && !writeAll(fd, buffer, used))
            failed = true;
        used = 0;
    }
};

// Copies the registry from `in` to `out` without the lines that start with
// `key`, one byte at a time so that lines of any length pass through.
bool copyWithoutKey(int in, Output& out, const char* key, size_t keyLength) {
    enum class State { Matching, Copying, Dropping } state = State::Matching;
    size_t matched = 0;
    char chunk[4096];
    for (;;) {
        ssize_t n = readSome(in, chunk, sizeof chunk);
        if (n < 0)
            return false;
        if (n == 0)
            break;
        for (ssize_t i = 0; i < n; ++i) {
            char c = chunk[i];
            switch (state) {
                case State::Matching:
                    if (c == key[matched]) {
                        if (++matched == keyLength)
                            state = State::Dropping;
                    } else {
                        out.put(key, matched);
                        out.put(c);
                        matched = 0;
                        if (c != '\n')
                            state = State::Copying;
                    }
                    break;
                case State::Copying:
                    out.put(c);
                    if (c == '\n')
                        state = State::Matching;
                    break;
                case State::Dropping:
                    if (c == '\n') {
                        state = State::Matching;
                        matched = 0;
                    }
                    break;
            }
        }
    }
    // A last line that began like the key but ended before it.
    if (state == State::Matching)
        out.put(key, matched);
    return true;
}

void syncDirectory(const char* dir) {
    int fd = open(dir, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0)
        return;
    fsync(fd);
    close(fd);
}

std::atomic<unsigned> gWriteSerial{0};
static_assert(std::atomic<unsigned>::is_always_lock_free);

}  // namespace

int32_t registryRead(const char* dir, const char* name, int32_t partition, char* value,
                     size_t capacity) {
    if (value == nullptr || capacity == 0)
        return kRegistryBadArgument;
    value[0] = '\0';
    char key[kKeyMax];
    size_t keyLength = buildKey(name, partition, key);
    char path[kPathMax];
    if (keyLength == 0 || !buildPath(dir, "registry", path))
        return kRegistryBadArgument;

    int fd = open(path, O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return errno == ENOENT ? kRegistryNoFile : kRegistryIoError;
    size_t limit = (capacity < kRegistryValueMax + 1 ? capacity : kRegistryValueMax + 1) - 1;
    enum class State { Matching, Skipping, Capturing, Done } state = State::Matching;
    size_t matched = 0;
    size_t length = 0;
    char chunk[4096];
    while (state != State::Done) {
        ssize_t n = readSome(fd, chunk, sizeof chunk);
        if (n < 0) {
            close(fd);
            value[0] = '\0';
            return kRegistryIoError;
        }
        if (n == 0)
            break;
        for (ssize_t i = 0; i < n && state != State::Done; ++i) {
            char c = chunk[i];
            switch (state) {
                case State::Matching:
                    if (c == key[matched]) {
                        if (++matched == keyLength)
                            state = State::Capturing;
                    } else {
                        matched = 0;
                        if (c != '\n')
                            state = State::Skipping;
                    }
                    break;
                case State::Skipping:
                    if (c == '\n')
                        state = State::Matching;
                    break;
                case State::Capturing:
                    if (c == '\n') {
                        state = State::Done;
                    } else if (length < limit) {
                        value[length++] = c;
                    }
                    break;
                case State::Done:
                    break;
            }
        }
    }
    close(fd);
    bool found = state == State::Capturing || state == State::Done;
    // Tolerate a file edited with Windows line ends.
    if (length > 0 && value[length - 1] == '\r')
        --length;
    value[length] = '\0';
    return found && length > 0 ? 0 : kRegistryNotSet;
}

int32_t registryWrite(const char* dir, const char* name, int32_t partition, const char* value) {
    if (value == nullptr)
        return kRegistryBadArgument;
    char key[kKeyMax];
    size_t keyLength = buildKey(name, partition, key);
    char path[kPathMax];
    if (keyLength == 0 || !buildPath(dir, "registry", path))
        return kRegistryBadArgument;
    size_t valueLength = std::strlen(value);
    if (valueLength > kRegistryValueMax)
        return kRegistryValueTooLong;
    if (std::memchr(value, '\n', valueLength) != nullptr ||
        std::memchr(value, '\r', valueLength) != nullptr) {
        return kRegistryBadArgument;
    }

    char tempName[64];
    FixedText temp(tempName, sizeof tempName);
    temp.add("registry.tmp.").addDecimal(static_cast<uint64_t>(getpid()));
    temp.addChar('.').addDecimal(gWriteSerial.fetch_add(1));
    char tempPath[kPathMax];
    if (temp.overflow() || !buildPath(dir, tempName, tempPath))
        return kRegistryBadArgument;

    int in = open(path, O_RDONLY | O_CLOEXEC);
    if (in < 0 && errno != ENOENT)
        return kRegistryIoError;
    if (in < 0 && valueLength == 0)
        return 0;  // nothing to remove
    mode_t mode = 0644;
    struct stat st {};
    if (in >= 0 && fstat(in, &st) == 0)
        mode = st.st_mode & 07777;

    int outFd = open(tempPath, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, mode);
    if (outFd < 0) {
        if (in >= 0)
            close(in);
        return kRegistryIoError;
    }
    Output out(outFd);
    bool ok = in < 0 || copyWithoutKey(in, out, key, keyLength);
    if (in >= 0)
        close(in);
    if (ok && valueLength > 0) {
        if (out.last != '\n')
            out.put('\n');
        out.put(key, keyLength);
        out.put(value, valueLength);
        out.put('\n');
    }
    out.flush();
    ok = ok && !out.failed;
    if (ok && out.total > 0) {
        ok = fchmod(outFd, mode) == 0 && fsync(outFd) == 0;
    }
    if (close(outFd) != 0)
        ok = false;
    if (!ok) {
        unlink(tempPath);
        return kRegistryIoError;
    }
    if (out.total == 0) {
        unlink(tempPath);
        if (unlink(path) != 0 && errno != ENOENT)
            return kRegistryIoError;
    } else if (rename(tempPath, path) != 0) {
        unlink(tempPath);
        return kRegistryIoError;
    }
    syncDirectory(dir);
    return 0;
}

bool internalPoolsExposed(const char* dir) {
    char value[kRegistryValueMax + 1];
    return registryRead(dir, "VRXMEMTRK", -1, value, sizeof value) == 0 &&
           std::strcmp(value, "1") == 0;
}

}  // namespace standin
