// The count of the client library's requests that look at instance.json (the
// set-up and every snapshot request). The system services check the file
// again only after such a request, so that a pool or message costs no file
// system call, while an edit still shows at the next snapshot, as the
// monitor shows it.
#include <atomic>

#include "common/export.h"
#include "common/instance.h"

namespace {

std::atomic<uint64_t> gInstanceRequests{0};

}  // namespace

extern "C" {

VRX_EXPORT void vrxStandinNoteInstanceRequest(void) {
    gInstanceRequests.fetch_add(1, std::memory_order_relaxed);
}

VRX_EXPORT uint64_t vrxStandinInstanceRequests(void) {
    return gInstanceRequests.load(std::memory_order_relaxed);
}
}
