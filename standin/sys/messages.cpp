// sqlogmsg: the engine's message service for numbered messages.
#include <algorithm>
#include <climits>
#include <cstring>
#include <string>

#include "catalogLookup.h"
#include "common/export.h"
#include "common/instance.h"
#include "engine/vrxsys.h"
#include "memoryTracking.h"
#include "messageCodes.h"
#include "messageText.h"

namespace {

constexpr unsigned kPlaceholders = 2;

// How many entries the caller's insert tables hold. Tables from sqlogmblkEx
// have a known size and are never read past it; for other memory only the
// entries that the text names are read, which is all a caller can expect.
unsigned insertEntries(const uint64_t* lengths, const char* const* inserts) {
    unsigned entries = kPlaceholders;
    if (auto size = standin::blockSize(lengths)) {
        entries = static_cast<unsigned>(std::min<uint64_t>(entries, *size / sizeof(uint64_t)));
    }
    if (auto size = standin::blockSize(inserts)) {
        entries = static_cast<unsigned>(std::min<uint64_t>(entries, *size / sizeof(char*)));
    }
    return entries;
}

bool messageFails(uint32_t number) {
    const auto& failing = standin::currentInstance().faults.messageFail;
    return std::find(failing.begin(), failing.end(), number) != failing.end();
}

}  // namespace

extern "C" VRX_EXPORT int32_t sqlogmsg(const char* catalog, uint32_t number,
                                       const uint64_t* insertLengths, const char* const* inserts,
                                       char* buffer, uint32_t bufferSize, uint32_t* reserved,
                                       uint16_t /*flags*/, void* /*reserved2*/,
                                       void* /*reserved3*/) {
    if (reserved != nullptr)
        *reserved = 0;
    if (catalog == nullptr || buffer == nullptr || bufferSize == 0) {
        return standin::kMessageBadArgument;
    }
    buffer[0] = '\0';
    if (messageFails(number))
        return standin::kMessageUnavailable;
    auto text = standin::findCatalogText(catalog, std::to_string(number));
    if (text == nullptr)
        return standin::kMessageNotFound;

    unsigned entries = insertEntries(insertLengths, inserts);
    auto insertText = [&](unsigned index) -> std::string_view {
        if (inserts == nullptr || index >= entries || inserts[index] == nullptr)
            return {};
        const char* insert = inserts[index];
        // The length table is the caller's word for the insert's size; a
        // terminator before that still ends it.
        size_t length = insertLengths != nullptr
                            ? strnlen(insert, static_cast<size_t>(insertLengths[index]))
                            : std::strlen(insert);
        return {insert, length};
    };
    size_t capacity = std::min<size_t>(bufferSize, static_cast<size_t>(INT32_MAX));
    return static_cast<int32_t>(standin::expandInsertsInto(*text, insertText, buffer, capacity));
}
