// Call results of the snapshot monitor's entry points. A nonzero call result
// means that the request itself was refused and the sqlca says nothing; the
// monitor's answers about the instance (too small, nothing to report, not
// started, not authorized) are SQL codes in the sqlca with a call result 0.
#pragma once

#include <cstdint>

namespace standin {

// The caller was built against another interface version than 9050000.
constexpr int32_t kMonBadInterfaceVersion = -2101;
// A null argument record, request, estimate word or sqlca, a buffer of
// nonzero size at a null address, a nonzero byte in the part of the object
// entry that belongs to the engine, or a partition, selector or flag word
// that this engine does not serve (one partition, addressed as -1).
constexpr int32_t kMonBadArgument = -2102;
// A data stream version other than 7.
constexpr int32_t kMonBadStreamVersion = -2103;
// A request for other than exactly one object.
constexpr int32_t kMonBadObjectCount = -2104;
// An object type other than instance, database or application.
constexpr int32_t kMonBadObjectType = -2105;
// The instance's description (instance.json, or a stream file that it
// names) cannot be read; the diagnostic log says why.
constexpr int32_t kMonInstanceUnreadable = -2106;

}  // namespace standin
