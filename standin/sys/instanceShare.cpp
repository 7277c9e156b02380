// What the client library tells the system services about instance.json:
// that it made a request that reads the file (the set-up and every snapshot
// request), and the settings it read. The services check the file again
// only after such a request, so that a pool or message costs no file system
// call while an edit still shows at the next snapshot, as the monitor shows
// it; and they take the settings just read instead of reading the whole
// file again themselves.
#include <atomic>
#include <memory>
#include <mutex>
#include <string>

#include "common/export.h"
#include "common/instance.h"
#include "common/instanceReader.h"

namespace {

std::atomic<uint64_t> gInstanceRequests{0};

struct Offer {
    std::string dir;
    standin::FileStamp stamp;
    standin::Instance settings;  // the defaults when the file was not valid
};

std::mutex& gOfferMutex = *new std::mutex;
// Never destroyed: services may be called from other libraries' destructors.
std::unique_ptr<Offer>& gOffer = *new std::unique_ptr<Offer>;

}  // namespace

extern "C" {

VRX_EXPORT void vrxStandinNoteInstanceRequest(void) {
    gInstanceRequests.fetch_add(1, std::memory_order_relaxed);
}

VRX_EXPORT uint64_t vrxStandinInstanceRequests(void) {
    return gInstanceRequests.load(std::memory_order_relaxed);
}

VRX_EXPORT void vrxStandinOfferInstance(const char* dir, const standin::FileStamp* stamp,
                                        const standin::Instance* settings) {
    auto offer = std::make_unique<Offer>();
    offer->dir = dir;
    offer->stamp = *stamp;
    offer->settings = settings != nullptr ? *settings : standin::Instance{};
    std::lock_guard lock(gOfferMutex);
    gOffer = std::move(offer);
}

VRX_EXPORT bool vrxStandinOfferedInstance(const char* dir, standin::FileStamp* stamp,
                                          standin::Instance* settings) {
    std::lock_guard lock(gOfferMutex);
    if (gOffer == nullptr || gOffer->dir != dir)
        return false;
    *stamp = gOffer->stamp;
    *settings = gOffer->settings;
    return true;
}
}
