#include "common/poolTable.h"

#include <iterator>

namespace standin {

namespace {

constexpr PoolTableEntry kPools[] = {
    {"agsh", "Application Group Shared Heap", false},  // 0
    {"appctlh", "Application Control Heap", false},
    {"apph", "Application Heap", false},
    {"bph", "Buffer Pool Heap", false},
    {"catcacheh", "Catalog Cache Heap", false},
    {"dbh", "Database Heap", false},  // 5
    {"dlfmh", "DFM Heap", false},
    {"fcmbp", "FCMBP Heap", false},
    {"ip", "Import Pool", false},
    {"lockh", "Lock Manager Heap", false},
    {"monh", "Database Monitor Heap", false},  // 10
    {"other", "Other Memory", false},
    {"pckcacheh", "Package Cache", false},
    {"queryh", "Query Heap", false},
    {"shsorth", "Shared Sort Heap", false},
    {"sorth", "Sort Heap", false},  // 15
    {"stath", "Statistics Heap", false},
    {"stmth", "Statement Heap", false},
    {"utilh", "Backup/Restore/Util Heap", false},
    {"undefh", "Undefined Heap", true},
    {"appshrh", "Applications Shared Heap", false},  // 20
    {"agenth", "Agent (DDS) Heap", true},
    {"apmh", "APM Heap", true},
    {"apsh", "APS Heap", true},
    {"bsuh", "BSU Heap", true},
    {"comh", "Communication (DDS) Heap", true},  // 25
    {"ctxh", "Common Client Context Heap", true},
    {"dbagentsh", "Database agents shared heap", true},
    {"debug", "Debug Heap", true},
    {"desadv", "Design Advisor Work Heap", true},
    {"mvh", "Mergevault Heap", true},  // 30
    {"dri", "Drop Index Heap", true},
    {"eduah", "EDU Anchor Heap", true},
    {"fcm", "FCM Pool", true},
    {"fcmbp", "FCM Resource Heap", true},
    {"fcmchan", "FCM Channel Heap", true},  // 35
    {"fcmctl", "FCMCTL Heap", true},
    {"fcmsess", "FCM Session Heap", true},
    {"kerh", "Kernel(BSU) Heap", true},
    {"krcbh", "Kernel Control Block Heap", true},
    {"mbosh", "MBOS Heap", true},  // 40
    {"oledb", "OLEDB Heap", true},
    {"optprofparse", "OptProf XML Parse", true},
    {"ostrack", "OSS OS Resource Tracking", true},
    {"persist", "Persistent Private Heap", true},
    {"private", "Private Heap", true},  // 45
    {"resynch", "Re-Sync Heap", true},
    {"simcath", "Simulation Catalog Heap", true},
    {"sqlch", "SQL Compiler Heap", true},
    {"toolsmh", "ADT Monitor Heap", true},
    {"userdatah", "User Data Private Heap", true},  // 50
    {"xmlcacheh", "XML Cache Heap", true},
    {"xmlparserh", "XML Parser Init Heap", true},
};

static_assert(std::size(kPools) == 53);

}  // namespace

uint32_t poolTableSize() {
    return static_cast<uint32_t>(std::size(kPools));
}

const PoolTableEntry* poolTableEntry(uint32_t id) {
    return id < poolTableSize() ? &kPools[id] : nullptr;
}

std::optional<uint32_t> poolIdByName(std::string_view name) {
    for (uint32_t id = 0; id < poolTableSize(); ++id) {
        if (name == kPools[id].name)
            return id;
    }
    return std::nullopt;
}

bool poolIsInternal(uint32_t id) {
    const PoolTableEntry* entry = poolTableEntry(id);
    return entry != nullptr && entry->internal;
}

}  // namespace standin
