#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <memory>
#include <mutex>

#include "common/fixedText.h"
#include "common/instance.h"
#include "common/instanceReader.h"

namespace standin {

namespace {

struct Cache {
    bool loaded = false;
    std::string dir;
    uint64_t requests = 0;  // vrxStandinInstanceRequests() when last checked
    FileStamp stamp;
    // The answer before the last reload stays alive too, so that a reference
    // taken by a caller survives a reload triggered by a service it calls.
    std::unique_ptr<Instance> instance = std::make_unique<Instance>();
    std::unique_ptr<Instance> previous;
};

bool sameFile(const struct stat& a, const struct stat& b) {
    return a.st_dev == b.st_dev && a.st_ino == b.st_ino && a.st_size == b.st_size &&
           a.st_mtim.tv_sec == b.st_mtim.tv_sec && a.st_mtim.tv_nsec == b.st_mtim.tv_nsec &&
           a.st_ctim.tv_sec == b.st_ctim.tv_sec && a.st_ctim.tv_nsec == b.st_ctim.tv_nsec;
}

// What a signal handler may learn about the instance without reading files:
// the registry write fault of the instance.json last loaded, with the file's
// identity at that time. Two slots, so that a handler interrupting a publish
// still reads a whole one.
struct Published {
    char dir[PATH_MAX];
    bool exists;
    struct stat fileStat;
    std::optional<int32_t> registryWrite;
};
Published gPublished[2];
std::atomic<int> gPublishedSlot{-1};

void publish(const std::filesystem::path& dir, bool exists, const struct stat& st,
             const Instance& instance) {
    if (dir.native().size() >= PATH_MAX)
        return;
    int slot = gPublishedSlot.load() == 0 ? 1 : 0;
    Published& p = gPublished[slot];
    std::memcpy(p.dir, dir.c_str(), dir.native().size() + 1);
    p.exists = exists;
    p.fileStat = st;
    p.registryWrite = instance.faults.registryWrite;
    gPublishedSlot.store(slot);
}

// Whether the file names `word` anywhere, read in stack-sized chunks.
bool fileMentions(const char* path, const char* word) {
    int fd = open(path, O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return false;
    size_t wordLength = std::strlen(word);
    char chunk[4096];
    size_t kept = 0;  // bytes carried over from the previous chunk
    bool found = false;
    for (;;) {
        ssize_t n = read(fd, chunk + kept, sizeof chunk - kept);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            break;
        size_t size = kept + static_cast<size_t>(n);
        for (size_t i = 0; !found && i + wordLength <= size; ++i) {
            found = std::memcmp(chunk + i, word, wordLength) == 0;
        }
        if (found)
            break;
        kept = size < wordLength - 1 ? size : wordLength - 1;
        std::memmove(chunk, chunk + size - kept, kept);
    }
    close(fd);
    return found;
}

}  // namespace

std::optional<int32_t> registryWriteFault(const char* dir) {
    char file[PATH_MAX + 32];
    FixedText path(file, sizeof file);
    path.add(dir).add("/instance.json");
    if (path.overflow())
        return std::nullopt;
    struct stat st {};
    bool exists = stat(file, &st) == 0;
    int slot = gPublishedSlot.load();
    if (slot >= 0) {
        const Published& p = gPublished[slot];
        if (std::strcmp(p.dir, dir) == 0 && p.exists == exists &&
            (!exists || sameFile(p.fileStat, st))) {
            return p.registryWrite;
        }
    }
    if (!exists || !fileMentions(file, "registryWrite"))
        return std::nullopt;
    return currentInstance().faults.registryWrite;
}

const Instance& currentInstance() {
    // Never destroyed: services may still be called from other libraries'
    // destructors while this one's statics are already gone.
    static Cache& cache = *new Cache;
    static std::mutex& mutex = *new std::mutex;
    std::lock_guard lock(mutex);

    // Services ask for every pool and message: between two requests of the
    // client library a call costs no file system call at all, and after one
    // a check of the file's status while the file stays as it was read.
    char dir[PATH_MAX];
    // Without an instance directory there is no file, and the defaults hold.
    bool usable = instanceDirectoryPath(dir, sizeof dir);
    uint64_t requests = vrxStandinInstanceRequests();
    if (cache.loaded && requests == cache.requests && cache.dir == dir)
        return *cache.instance;
    char file[PATH_MAX + 32];
    FixedText path(file, sizeof file);
    if (usable)
        usable = !path.add(dir).add("/instance.json").overflow();
    if (cache.loaded && cache.dir == dir &&
        (usable ? stillCurrent(file, cache.stamp) : !cache.stamp.exists)) {
        cache.requests = requests;
        return *cache.instance;
    }

    cache.loaded = true;
    cache.dir = dir;
    cache.requests = requests;
    auto instance = std::make_unique<Instance>();
    InstanceSink poolsNotKept;
    std::string error;
    // The client library's last read serves while the file is still the
    // one it read: a large instance is not read once more for its settings.
    bool offered = usable && vrxStandinOfferedInstance(dir, &cache.stamp, instance.get()) &&
                   stillCurrent(file, cache.stamp);
    if (!offered) {
        cache.stamp = FileStamp{};
        if (!usable || !readInstanceFile(dir, *instance, poolsNotKept, error, &cache.stamp))
            *instance = Instance{};
    }
    cache.previous = std::move(cache.instance);
    cache.instance = std::move(instance);
    publish(dir, cache.stamp.exists, cache.stamp.st, *cache.instance);
    return *cache.instance;
}

}  // namespace standin
