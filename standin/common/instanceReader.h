// Reading instance.json in one streaming pass, for instances far larger than
// any written by hand: the settings are kept, the pools are handed on to a
// sink as they are met and never held as a whole, so that the memory a read
// takes does not grow with the instance.
//
// The fast reader accepts the plain JSON that instance files are made of.
// Anything it does not vouch for (a mistake, or a form it leaves alone: a
// \u escape, a byte above 127, a byte order mark) is left to the thorough
// parser of instanceJson.cpp, which decides and explains; the two accept
// exactly the same files with the same meaning.
#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <ctime>
#include <span>
#include <string>
#include <string_view>

#include "common/instance.h"

namespace standin {

// One pool as read. The buffer pool name lives as long as the sink call that
// receives the pool.
struct PoolRead {
    uint32_t id = 0;
    bool hasCurrent = false;
    bool hasMaximum = false;
    bool hasHighWater = false;
    bool hasBufferPool = false;
    int64_t current = 0;
    int64_t maximum = 0;
    int64_t highWater = 0;
    std::string_view bufferPool;
};

// A database, an application or a private memory section with its pools.
// `name` is a database's own name or an application's database.
struct SectionRead {
    uint32_t number = 0;
    std::string_view name;
    std::span<const PoolRead> pools;
};

enum class PoolList { Instance, Databases, Applications, PrivateMemory };

// Receives the pools of an instance in file order: the instance's own pools
// in batches, every section whole, the end of each list and of the file.
class InstanceSink {
  public:
    virtual ~InstanceSink() = default;
    // Everything received so far is void; the instance is handed on afresh.
    virtual void restart() {}
    virtual void instancePools(std::span<const PoolRead> /*pools*/) {}
    virtual void section(PoolList /*list*/, const SectionRead& /*section*/) {}
    virtual void endList(PoolList /*list*/) {}
    virtual void endDocument() {}
};

// How a read saw instance.json: whether it existed, its status, and the file
// system clock just before the read began.
struct FileStamp {
    bool exists = false;
    struct stat st {};
    timespec readStart{};
};

// Whether `path` certainly still holds what `stamp` saw: the same file with
// the same size and times, and no later change that the times could hide.
// File times come from a clock that ticks every few milliseconds, so a file
// that was read within the tick of its last change might change again
// without its times showing it; such a file is never taken as unchanged.
bool stillCurrent(const char* path, const FileStamp& stamp);

// The fast reader alone, over the text of an instance.json: true when it
// vouches for the text, with `settings` holding everything but the pool
// lists (left empty) and the pools handed to `sink`. False says nothing
// about the text; the sink may have received part of it.
bool readInstanceText(std::string_view text, Instance& settings, InstanceSink& sink);

// Reads <dir>/instance.json as loadInstance does, with the same result and
// the same error text, but the pool lists go to `sink` instead of into
// `settings`. `stamp` (may be null) receives how the file was seen.
bool readInstanceFile(const char* dir, Instance& settings, InstanceSink& sink, std::string& error,
                      FileStamp* stamp);

}  // namespace standin

// Kept by the system services' library (not part of the engine's
// interface): the client library offers the settings of each read of
// instance.json that it makes, with the file's stamp; the services take
// them while the file is still the one read. Settings are the defaults when
// the file was not valid.
extern "C" {
void vrxStandinOfferInstance(const char* dir, const standin::FileStamp* stamp,
                             const standin::Instance* settings);
bool vrxStandinOfferedInstance(const char* dir, standin::FileStamp* stamp,
                               standin::Instance* settings);
}
