#include <dlfcn.h>
#include <limits.h>
#include <stdlib.h>
#include <unistd.h>

#include <cstring>

#include "common/instance.h"

namespace standin {

namespace {

// Worked out once when the library is loaded: dladdr and realpath take locks
// and allocate, which the signal-safe callers of instanceDirectoryPath must
// not do, and the answer cannot change while the library stays loaded.
char gDataDirectory[PATH_MAX];
char gDemoDirectory[PATH_MAX];

void anchor() {}

bool ownFilePath(char* out, size_t capacity) {
    Dl_info info{};
    const char* file = nullptr;
    if (dladdr(reinterpret_cast<void*>(&anchor), &info) != 0 && info.dli_fname != nullptr &&
        std::strchr(info.dli_fname, '/') != nullptr) {
        file = info.dli_fname;
    }
    // Linked into an executable rather than a shared library, dladdr may name
    // the program as it was invoked; the kernel knows the real file.
    char self[PATH_MAX];
    if (file == nullptr) {
        ssize_t n = readlink("/proc/self/exe", self, sizeof self - 1);
        if (n <= 0)
            return false;
        self[n] = '\0';
        file = self;
    }
    char resolved[PATH_MAX];
    if (realpath(file, resolved) == nullptr)
        return false;
    if (std::strlen(resolved) >= capacity)
        return false;
    std::strcpy(out, resolved);
    return true;
}

void copyPath(char* out, size_t capacity, const std::filesystem::path& path) {
    const std::string& text = path.native();
    if (text.size() < capacity)
        std::memcpy(out, text.c_str(), text.size() + 1);
}

__attribute__((constructor(101))) void locateData() {
    char own[PATH_MAX];
    if (!ownFilePath(own, sizeof own))
        return;
    std::filesystem::path data =
        (std::filesystem::path(own).parent_path() / VRX_DATA_FROM_LIBDIR).lexically_normal();
    // lexically_normal keeps a trailing separator; callers append to the path.
    if (data.has_filename() == false)
        data = data.parent_path();
    copyPath(gDataDirectory, sizeof gDataDirectory, data);
    copyPath(gDemoDirectory, sizeof gDemoDirectory, data / "demo");
}

}  // namespace

bool instanceDirectoryPath(char* out, size_t capacity) {
    if (capacity == 0)
        return false;
    out[0] = '\0';
    const char* dir = getenv("VRX_INSTANCE_DIR");
    if (dir == nullptr || dir[0] == '\0')
        dir = gDemoDirectory;
    size_t length = std::strlen(dir);
    if (length == 0 || length >= capacity)
        return false;
    std::memcpy(out, dir, length + 1);
    return true;
}

std::filesystem::path instanceDirectory() {
    char dir[PATH_MAX];
    if (!instanceDirectoryPath(dir, sizeof dir))
        return {};
    return dir;
}

std::filesystem::path dataDirectory() {
    return gDataDirectory;
}

}  // namespace standin
