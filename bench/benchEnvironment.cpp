#include "benchEnvironment.h"

#include <cstdlib>
#include <fstream>
#include <stdexcept>

namespace bench {

namespace {

void write(const std::filesystem::path& file, const std::string& bytes) {
    std::ofstream out(file, std::ios::binary | std::ios::trunc);
    out.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    if (!out)
        throw std::runtime_error("cannot write " + file.string());
}

}  // namespace

Environment::Environment() {
    std::string pattern = (std::filesystem::temp_directory_path() / "vrxbench.XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr)
        throw std::runtime_error("cannot make a temporary directory");
    dir_ = pattern;
    write(dir_ / "instance.json",
          R"({"snapshots": {"application": {"streamFile": "application.bin"},)"
          R"( "database": {"streamFile": "database.bin"}}})");
    serve("application", "");
    serve("database", "");
    setenv("VRX_INSTANCE_DIR", dir_.c_str(), 1);
}

void Environment::serve(const std::string& objectType, const std::string& stream) const {
    write(dir_ / (objectType + ".bin"), stream);
}

void Environment::remove() const {
    std::error_code ignored;
    std::filesystem::remove_all(dir_, ignored);
}

Environment& environment() {
    static Environment& instance = *new Environment;
    return instance;
}

}  // namespace bench
