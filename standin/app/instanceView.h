// What the client library knows of its instance between requests: the
// settings of instance.json and the sizes of the streams it gives, kept for
// as long as the file certainly stays as it was read.
#pragma once

#include <memory>
#include <string>

#include "app/streamEncoder.h"
#include "common/instance.h"
#include "common/instanceReader.h"

namespace standin {

struct InstanceView {
    std::string dir;
    FileStamp stamp;
    bool valid = false;
    std::string error;  // why not, as loadInstance words it
    Instance settings;  // without the pool lists
    StreamSizes sizes;
};

// The view of the instance in `dir`: the one kept, unless instance.json may
// have changed since it was read; then the file is read again.
std::shared_ptr<const InstanceView> instanceView(const std::string& dir);

// Reads the instance in `dir` afresh with `sink` (which is also what makes
// the new view's sizes), and keeps the result as the view.
std::shared_ptr<const InstanceView> readInstanceView(const std::string& dir, StreamSizer& sink);

}  // namespace standin
