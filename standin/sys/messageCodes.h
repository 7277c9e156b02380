// Results of the message services (sqlogmsg, sqlaintp_api) when they fail.
// All are negative as signed 32-bit values, which is what callers test.
#pragma once

#include <cstdint>

namespace standin {

// No catalog on the search path holds the message.
constexpr int32_t kMessageNotFound = static_cast<int32_t>(0x870F0041);
// A null or empty buffer, a missing catalog name or status area.
constexpr int32_t kMessageBadArgument = static_cast<int32_t>(0x870F0042);
// The message exists but cannot be delivered (faults.messageFail).
constexpr int32_t kMessageUnavailable = static_cast<int32_t>(0x870F0043);

}  // namespace standin
