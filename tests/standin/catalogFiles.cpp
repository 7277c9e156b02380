#include "catalogFiles.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <random>

#include "engine/vrxsys.h"

namespace mtrktest {

namespace fs = std::filesystem;

namespace {

void putWord(std::string& out, size_t offset, uint32_t value, bool bigEndian) {
    for (int i = 0; i < 4; ++i) {
        int shift = bigEndian ? 24 - 8 * i : 8 * i;
        out[offset + static_cast<size_t>(i)] = static_cast<char>((value >> shift) & 0xFF);
    }
}

const char* const kLocaleVariables[] = {"LC_ALL", "LC_MESSAGES", "LANG", "VRX_INSTANCE_DIR"};

}  // namespace

std::string buildMo(const CatalogEntries& entries, bool bigEndian) {
    CatalogEntries all = entries;
    all.emplace_back("", "Content-Type: text/plain; charset=UTF-8\n");
    std::stable_sort(all.begin(), all.end(),
                     [](const auto& a, const auto& b) { return a.first < b.first; });
    const uint32_t n = static_cast<uint32_t>(all.size());
    const uint32_t originals = 28;
    const uint32_t translations = originals + 8 * n;
    std::string mo(translations + 8 * n, '\0');
    putWord(mo, 0, 0x950412de, bigEndian);
    putWord(mo, 4, 0, bigEndian);
    putWord(mo, 8, n, bigEndian);
    putWord(mo, 12, originals, bigEndian);
    putWord(mo, 16, translations, bigEndian);
    putWord(mo, 20, 0, bigEndian);  // no hash table
    putWord(mo, 24, static_cast<uint32_t>(mo.size()), bigEndian);
    auto addString = [&](size_t tableEntry, const std::string& s) {
        putWord(mo, tableEntry, static_cast<uint32_t>(s.size()), bigEndian);
        putWord(mo, tableEntry + 4, static_cast<uint32_t>(mo.size()), bigEndian);
        mo += s;
        mo += '\0';
    };
    for (uint32_t i = 0; i < n; ++i)
        addString(originals + 8 * i, all[i].first);
    for (uint32_t i = 0; i < n; ++i)
        addString(translations + 8 * i, all[i].second);
    return mo;
}

void patchWord(std::string& mo, size_t offset, uint32_t value) {
    bool bigEndian = static_cast<uint8_t>(mo[0]) == 0x95;
    putWord(mo, offset, value, bigEndian);
}

void MessageTest::SetUp() {
    for (const char* name : kLocaleVariables) {
        const char* value = std::getenv(name);
        savedEnv_[name] = value ? std::optional<std::string>(value) : std::nullopt;
        if (std::strcmp(name, "VRX_INSTANCE_DIR") != 0)
            unsetenv(name);
    }
    std::random_device random;
    prefix_ = "t" + std::to_string(getpid()) + "r" + std::to_string(random() % 100000) + "x";
    instance_ = std::make_unique<TempInstance>(false);
    instance_->activate();
}

void MessageTest::removeInstalledCatalogs() {
    std::error_code ec;
    for (const auto& dir : installed_)
        fs::remove_all(dir, ec);
    installed_.clear();
    vrxStandinNoteInstanceRequest();
}

void MessageTest::TearDown() {
    removeInstalledCatalogs();
    instance_.reset();
    for (const auto& [name, value] : savedEnv_) {
        if (value) {
            setenv(name.c_str(), value->c_str(), 1);
        } else {
            unsetenv(name.c_str());
        }
    }
}

std::string MessageTest::installCatalog(const std::string& locale, const std::string& catalog,
                                        const CatalogEntries& entries) {
    std::string name = localeName(locale);
    fs::path dir = fs::path(VRX_BUILD_DATADIR) / "locale" / name;
    fs::create_directories(dir);
    installed_.push_back(dir);
    std::ofstream(dir / catalog, std::ios::binary) << buildMo(entries);
    // Catalogs are looked at again after the client library's next request.
    vrxStandinNoteInstanceRequest();
    return name;
}

void MessageTest::instanceCatalog(const std::string& catalog, const CatalogEntries& entries) {
    instance_->writeFile("msg/" + catalog, buildMo(entries));
}

MessageTest::Fetched MessageTest::fetch(const std::string& catalog, uint32_t number,
                                        const std::vector<std::string>& inserts,
                                        uint32_t bufferSize) {
    size_t entries = std::max<size_t>(inserts.size(), 1);
    void* lengthBlock = nullptr;
    void* pointerBlock = nullptr;
    EXPECT_EQ(
        sqlogmblkEx(0, entries * sizeof(uint64_t), 0, &lengthBlock, "catalogtest", __LINE__, 0), 0);
    EXPECT_EQ(sqlogmblkEx(0, entries * sizeof(char*), 0, &pointerBlock, "catalogtest", __LINE__, 0),
              0);
    auto* lengths = static_cast<uint64_t*>(lengthBlock);
    auto* pointers = static_cast<const char**>(pointerBlock);
    lengths[0] = 0;
    pointers[0] = nullptr;
    for (size_t i = 0; i < inserts.size(); ++i) {
        lengths[i] = inserts[i].size();
        pointers[i] = inserts[i].c_str();
    }
    std::vector<char> buffer(bufferSize + 1, '\x7f');
    uint32_t reserved = 0;
    Fetched result;
    result.rc = sqlogmsg(catalog.c_str(), number, lengths, pointers, buffer.data(), bufferSize,
                         &reserved, 0, nullptr, nullptr);
    EXPECT_EQ(buffer[bufferSize], '\x7f') << "wrote past the buffer";
    if (result.rc >= 0) {
        result.text = buffer.data();
        EXPECT_EQ(static_cast<size_t>(result.rc), result.text.size());
    }
    sqlofmblkEx("catalogtest", __LINE__, lengthBlock);
    sqlofmblkEx("catalogtest", __LINE__, pointerBlock);
    return result;
}

}  // namespace mtrktest
