// Catalog files and a clean message environment for the tests of the
// engine's message services.
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "common/instance.h"
#include "testInstance.h"

namespace mtrktest {

using CatalogEntries = std::vector<std::pair<std::string, std::string>>;

// The bytes of a .mo file holding `entries` (and the usual header entry),
// laid out as msgfmt lays it out: header, original table, translation
// table, strings each followed by a NUL.
std::string buildMo(const CatalogEntries& entries, bool bigEndian = false);

// Puts a word of a .mo image at `offset` in the image's byte order.
void patchWord(std::string& mo, size_t offset, uint32_t value);

// Makes each test start from a known message environment: the locale
// variables cleared, a fresh instance without catalogs active, and locale
// directories of the installed data created on demand under names that no
// other test process uses (removed again afterwards). Everything is put back
// at the end.
class MessageTest : public ::testing::Test {
  protected:
    void SetUp() override;
    void TearDown() override;

    // Writes <installed data>/locale/<unique prefix + locale>/<catalog> and
    // returns the locale's full name to put into LANG and the like.
    std::string installCatalog(const std::string& locale, const std::string& catalog,
                               const CatalogEntries& entries);
    // The unique full name under which installCatalog puts `locale`.
    std::string localeName(const std::string& locale) const { return prefix_ + locale; }
    // Removes the catalogs that installCatalog wrote.
    void removeInstalledCatalogs();
    // Writes the instance's own msg/<catalog>.
    void instanceCatalog(const std::string& catalog, const CatalogEntries& entries);

    // sqlogmsg with up to two inserts in tables of exactly that many entries
    // (one null entry for none), the way the program calls it. The text on
    // success; the negative result otherwise.
    struct Fetched {
        int32_t rc = 0;
        std::string text;
    };
    Fetched fetch(const std::string& catalog, uint32_t number,
                  const std::vector<std::string>& inserts = {}, uint32_t bufferSize = 5000);

    std::unique_ptr<TempInstance> instance_;

  private:
    std::string prefix_;
    std::vector<std::filesystem::path> installed_;
    std::map<std::string, std::optional<std::string>> savedEnv_;
};

}  // namespace mtrktest
