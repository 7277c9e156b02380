// The snapshot monitor: vrxGetSnapshotSize and vrxGetSnapshot.
//
// Every take reads instance.json afresh, so that an edited file shows in
// the next snapshot of a running client; the size estimate comes from the
// last read while the file is certainly unchanged since. A request is checked
// before anything is read; a refused request is a nonzero call result (see
// snapshotCodes.h). What the monitor has to say about the instance is the
// SQL code in the sqlca.
#include <algorithm>
#include <array>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "app/instanceView.h"
#include "app/snapshotCodes.h"
#include "app/streamEncoder.h"
#include "common/diagLog.h"
#include "common/instance.h"
#include "common/registry.h"
#include "engine/vrxapp.h"

namespace standin {

namespace {

constexpr int32_t kSqlOk = 0;
constexpr uint64_t kMaxBuffer = 0xFFFFFFFFu;

const char* kindName(SnapshotKind kind) {
    switch (kind) {
        case SnapshotKind::Instance:
            return "instance";
        case SnapshotKind::Database:
            return "database";
        case SnapshotKind::Application:
            return "application";
    }
    return "?";
}

void answer(sqlca* ca, int32_t sqlCode) {
    std::memset(ca, 0, sizeof(*ca));
    std::memcpy(ca->sqlcaid, "SQLCA   ", sizeof(ca->sqlcaid));
    ca->sqlcabc = sizeof(sqlca);
    ca->sqlcode = sqlCode;
}

int32_t checkObject(const MonRequest* request, SnapshotKind* kind) {
    if (request == nullptr)
        return kMonBadArgument;
    if (request->objectCount != 1)
        return kMonBadObjectCount;
    // The rest of the object entry is the engine's: a client leaves it zero.
    if (request->reserved != 0)
        return kMonBadArgument;
    for (uint8_t byte : request->engineArea) {
        if (byte != 0)
            return kMonBadArgument;
    }
    switch (request->objectType) {
        case VRX_OBJ_INSTANCE:
            *kind = SnapshotKind::Instance;
            return 0;
        case VRX_OBJ_DATABASE:
            *kind = SnapshotKind::Database;
            return 0;
        case VRX_OBJ_APPLICATION:
            *kind = SnapshotKind::Application;
            return 0;
        default:
            return kMonBadObjectType;
    }
}

int32_t checkAddressing(uint32_t streamVersion, int32_t partition, uint32_t selector) {
    if (streamVersion != VRX_STREAM_VERSION)
        return kMonBadStreamVersion;
    if (partition != -1 || selector != 0)
        return kMonBadArgument;
    return 0;
}

// The instance as one request sees it, with the stream it would be served.
struct Served {
    std::string dir;
    std::shared_ptr<const InstanceView> view;
    SnapshotKind kind = SnapshotKind::Instance;
    std::optional<std::string> fileStream;  // a streamFile's bytes, as they stand

    const Instance& settings() const { return view->settings; }
    const SnapshotAnswer& shape() const { return settings().snapshots[static_cast<int>(kind)]; }
};

int32_t unreadable(const std::string& error) {
    logEngineProblem("snapshot monitor: " + error);
    return kMonInstanceUnreadable;
}

int32_t loadServed(SnapshotKind kind, Served& served) {
    served.kind = kind;
    served.dir = instanceDirectory().string();
    served.view = instanceView(served.dir);
    if (!served.view->valid)
        return unreadable(served.view->error);
    return 0;
}

int32_t loadFileStream(Served& served) {
    const auto& file = served.shape().streamFile;
    if (!file)
        return 0;
    std::filesystem::path path = std::filesystem::path(served.dir) / *file;
    std::ifstream in(path, std::ios::binary);
    std::string bytes;
    if (in) {
        // In one piece where the size is known; whatever else the file holds
        // by the time it is read, byte by byte.
        std::error_code unknown;
        auto size = static_cast<std::streamsize>(std::filesystem::file_size(path, unknown));
        if (!unknown && size > 0) {
            bytes.resize(static_cast<size_t>(size));
            in.read(bytes.data(), size);
            bytes.resize(static_cast<size_t>(in.gcount()));
        }
        if (!in.bad()) {
            in.clear();
            bytes.append(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
        }
    }
    if (!in.is_open() || in.bad()) {
        logEngineProblem(std::string("snapshot monitor: instance.json: snapshots.") +
                         kindName(served.kind) + ".streamFile: cannot read " + path.string());
        return kMonInstanceUnreadable;
    }
    served.fileStream = std::move(bytes);
    return 0;
}

// The SQL code with which the instance's state and content refuse a
// snapshot of this kind, or 0.
int32_t refusal(const Instance& settings, const StreamSizes& sizes, SnapshotKind kind,
                bool fileStream, int32_t configuredCode) {
    if (settings.state == State::Stopped)
        return SQLC_INSTANCE_STOPPED;
    if (settings.state == State::Unauthorized)
        return SQLC_NOT_AUTHORIZED;
    if (configuredCode != 0)
        return configuredCode;
    if (fileStream)
        return kSqlOk;
    switch (kind) {
        case SnapshotKind::Database:
            if (sizes.databases == 0)
                return SQLC_NOTHING_TO_REPORT;
            break;
        case SnapshotKind::Application:
            if (sizes.applications == 0 && sizes.privateSections == 0) {
                return SQLC_NOTHING_TO_REPORT;
            }
            break;
        case SnapshotKind::Instance:
            break;
    }
    return kSqlOk;
}

int32_t refusal(const Served& served, int32_t configuredCode) {
    return refusal(served.settings(), served.view->sizes, served.kind,
                   served.fileStream.has_value(), configuredCode);
}

StreamScope scopeOf(const Served& served) {
    return StreamScope{served.kind, internalPoolsExposed(served.dir.c_str())};
}

uint64_t streamSize(const Served& served, StreamScope scope) {
    if (served.fileStream)
        return served.fileStream->size();
    return served.view->sizes.of(scope);
}

// Takes that answer 1606 whatever the buffer, counted per object type for
// as long as the process lives. The count is kept per instance directory,
// so that a process that serves one instance after another (a test suite)
// starts each one afresh.
bool forcedTooSmall(const Served& served) {
    static std::mutex mutex;
    static std::map<std::string, std::array<uint32_t, 3>> taken;
    uint32_t limit = served.shape().tooSmall;
    if (limit == 0)
        return false;
    std::lock_guard lock(mutex);
    uint32_t& count = taken[served.dir][static_cast<int>(served.kind)];
    if (count >= limit)
        return false;
    ++count;
    return true;
}

// Encodes the stream into the caller's buffer while instance.json is read
// once more. The file was found unchanged a moment ago; should it have
// changed since, the answer is the one the new file gives, and a stream that
// no longer fits the buffer is answered 1606 (the part that fit is written).
int32_t encodeInto(const Served& served, StreamScope scope, char* out, uint32_t capacity,
                   uint64_t* size, sqlca* ca) {
    StreamWriter writer(scope, out, capacity);
    auto view = readInstanceView(served.dir, writer);
    if (!view->valid)
        return unreadable(view->error);
    *size = writer.size();
    const SnapshotAnswer& shape = view->settings.snapshots[static_cast<int>(served.kind)];
    if (shape.takeRc != 0)
        return shape.takeRc;
    if (int32_t code =
            refusal(view->settings, view->sizes, served.kind, false, shape.takeSqlcode)) {
        answer(ca, code);
    } else if (writer.size() > capacity) {
        answer(ca, SQLC_BUFFER_TOO_SMALL);
    }
    return 0;
}

// What both entry points check and read before they answer: the stream's
// addressing, the object asked for, and the instance that serves it.
int32_t openRequest(uint32_t streamVersion, int32_t partition, uint32_t selector,
                    const MonRequest* request, Served& served) {
    if (int32_t rc = checkAddressing(streamVersion, partition, selector))
        return rc;
    SnapshotKind kind;
    if (int32_t rc = checkObject(request, &kind))
        return rc;
    return loadServed(kind, served);
}

// What both entry points answer, in the same order, once the request is
// open and before the stream's size counts: the configured call result, a
// stream file that cannot be read, a refusal by SQL code. `answered` says
// whether one of them answered the call (with the result returned).
int32_t answerBeforeTheStream(Served& served, bool take, sqlca* ca, bool* answered) {
    const SnapshotAnswer& shape = served.shape();
    answer(ca, kSqlOk);
    *answered = true;
    if (int32_t rc = take ? shape.takeRc : shape.sizeRc)
        return rc;
    if (int32_t rc = loadFileStream(served))
        return rc;
    if (int32_t code = refusal(served, take ? shape.takeSqlcode : shape.sizeSqlcode)) {
        answer(ca, code);
        return 0;
    }
    *answered = false;
    return 0;
}

int32_t getSnapshotSize(uint32_t version, MonSizeRequest* request, sqlca* ca) {
    if (version != VRX_MONITOR_VERSION)
        return kMonBadInterfaceVersion;
    if (request == nullptr || ca == nullptr || request->estimate == nullptr) {
        return kMonBadArgument;
    }
    Served served;
    if (int32_t rc = openRequest(request->streamVersion, request->partition, request->selector,
                                 request->request, served)) {
        return rc;
    }
    *request->estimate = 0;
    bool answered = false;
    if (int32_t rc = answerBeforeTheStream(served, false, ca, &answered); answered)
        return rc;
    const SnapshotAnswer& shape = served.shape();
    uint64_t size = streamSize(served, scopeOf(served));
    *request->estimate =
        shape.estimate ? *shape.estimate : static_cast<uint32_t>(std::min(size, kMaxBuffer));
    return 0;
}

int32_t getSnapshot(uint32_t version, MonSnapshotRequest* request, sqlca* ca) {
    if (version != VRX_MONITOR_VERSION)
        return kMonBadInterfaceVersion;
    if (request == nullptr || ca == nullptr)
        return kMonBadArgument;
    if (request->buffer == nullptr && request->bufferSize != 0)
        return kMonBadArgument;
    if (request->flags != 0)
        return kMonBadArgument;
    Served served;
    if (int32_t rc = openRequest(request->streamVersion, request->partition, request->selector,
                                 request->request, served)) {
        return rc;
    }
    bool answered = false;
    if (int32_t rc = answerBeforeTheStream(served, true, ca, &answered); answered)
        return rc;
    StreamScope scope = scopeOf(served);
    uint64_t size = streamSize(served, scope);
    if (forcedTooSmall(served) || size > request->bufferSize) {
        answer(ca, SQLC_BUFFER_TOO_SMALL);
        return 0;
    }
    auto* out = static_cast<char*>(request->buffer);
    if (served.fileStream) {
        if (size != 0)
            std::memcpy(out, served.fileStream->data(), size);
    } else if (int32_t rc = encodeInto(served, scope, out, request->bufferSize, &size, ca)) {
        return rc;
    }
    if (ca->sqlcode != kSqlOk)
        return 0;
    if (request->output != nullptr) {
        std::memset(request->output, 0, sizeof(*request->output));
        request->output->bytesWritten = static_cast<uint32_t>(size);
        request->output->objectsWritten = 1;
    }
    if (request->engineWord != nullptr)
        *request->engineWord = static_cast<uint32_t>(size);
    return 0;
}

}  // namespace

}  // namespace standin

extern "C" __attribute__((visibility("default"))) int32_t vrxGetSnapshotSize(
    uint32_t version, MonSizeRequest* request, sqlca* ca) {
    return standin::getSnapshotSize(version, request, ca);
}

extern "C" __attribute__((visibility("default"))) int32_t vrxGetSnapshot(
    uint32_t version, MonSnapshotRequest* request, sqlca* ca) {
    return standin::getSnapshot(version, request, ca);
}
