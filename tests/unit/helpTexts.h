// The two help outputs as the terse test catalogs render them: messages 42
// and 85, then the legends, written out by hand from the pool tables.
#pragma once

#include <string>

namespace mtrktest {

inline const std::string kStandardLegend =
    "   agsh      - Application Group Shared Heap   lockh     - Lock Manager Heap\n"
    "   appctlh   - Application Control Heap        monh      - Database Monitor Heap\n"
    "   apph      - Application Heap                other     - Other Memory\n"
    "   appshrh   - Applications Shared Heap        pckcacheh - Package Cache\n"
    "   bph       - Buffer Pool Heap                queryh    - Query Heap\n"
    "   catcacheh - Catalog Cache Heap              shsorth   - Shared Sort Heap\n"
    "   dbh       - Database Heap                   sorth     - Sort Heap\n"
    "   dlfmh     - DFM Heap                        stath     - Statistics Heap\n"
    "   fcmbp     - FCMBP Heap                      stmth     - Statement Heap\n"
    "   ip        - Import Pool                     utilh     - Backup/Restore/Util Heap\n"
    "\n\n";

inline const std::string kInternalLegend =
    "   agenth    - Agent (DDS) Heap                kerh      - Kernel(BSU) Heap\n"
    "   apmh      - APM Heap                        krcbh     - Kernel Control Block Heap\n"
    "   apsh      - APS Heap                        mbosh     - MBOS Heap\n"
    "   bsuh      - BSU Heap                        oledb     - OLEDB Heap\n"
    "   comh      - Communication (DDS) Heap        optprofparse - OptProf XML Parse\n"
    "   ctxh      - Common Client Context Heap      ostrack   - OSS OS Resource Tracking\n"
    "   dbagentsh - Database agents shared heap     persist   - Persistent Private Heap\n"
    "   debug     - Debug Heap                      private   - Private Heap\n"
    "   desadv    - Design Advisor Work Heap        resynch   - Re-Sync Heap\n"
    "   mvh       - Mergevault Heap                 simcath   - Simulation Catalog Heap\n"
    "   dri       - Drop Index Heap                 sqlch     - SQL Compiler Heap\n"
    "   eduah     - EDU Anchor Heap                 toolsmh   - ADT Monitor Heap\n"
    "   fcm       - FCM Pool                        undefh    - Undefined Heap\n"
    "   fcmbp     - FCM Resource Heap               userdatah - User Data Private Heap\n"
    "   fcmchan   - FCM Channel Heap                xmlcacheh - XML Cache Heap\n"
    "   fcmctl    - FCMCTL Heap                     xmlparserh - XML Parser Init Heap\n"
    "   fcmsess   - FCM Session Heap\n"
    "\n\n";

inline const std::string kBasicHelp = "usage\noptions\n" + kStandardLegend;

inline const std::string kExtendedHelp =
    "usage\noptions\ninternal help\n\n" + kStandardLegend + "internal legend\n\n" + kInternalLegend;

}  // namespace mtrktest
