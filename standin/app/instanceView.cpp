#include "app/instanceView.h"

#include <mutex>

namespace standin {

namespace {

std::mutex gViewMutex;
// Never destroyed: a client may still take snapshots from static destructors.
std::shared_ptr<const InstanceView>& gView = *new std::shared_ptr<const InstanceView>;

}  // namespace

std::shared_ptr<const InstanceView> readInstanceView(const std::string& dir, StreamSizer& sink) {
    vrxStandinNoteInstanceRequest();
    auto view = std::make_shared<InstanceView>();
    view->dir = dir;
    view->valid = readInstanceFile(dir.c_str(), view->settings, sink, view->error, &view->stamp);
    vrxStandinOfferInstance(dir.c_str(), &view->stamp, view->valid ? &view->settings : nullptr);
    view->sizes = sink.sizes();
    std::lock_guard lock(gViewMutex);
    gView = view;
    return view;
}

std::shared_ptr<const InstanceView> instanceView(const std::string& dir) {
    std::shared_ptr<const InstanceView> kept;
    {
        std::lock_guard lock(gViewMutex);
        kept = gView;
    }
    if (kept != nullptr && kept->dir == dir &&
        stillCurrent((dir + "/instance.json").c_str(), kept->stamp)) {
        vrxStandinNoteInstanceRequest();  // a read serves it; readInstanceView notes its own
        return kept;
    }
    StreamSizer sizer;
    return readInstanceView(dir, sizer);
}

}  // namespace standin
