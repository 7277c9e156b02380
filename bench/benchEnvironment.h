// The instance directory that the engine serves while the benchmarks run:
// its instance.json serves the application and database snapshots from
// stream files, which a benchmark replaces with streams of the size it
// measures.
#pragma once

#include <filesystem>
#include <string>

namespace bench {

class Environment {
  public:
    Environment();
    const std::filesystem::path& dir() const { return dir_; }
    // Puts `stream` where the engine serves the snapshots of `objectType`
    // (database or application) from.
    void serve(const std::string& objectType, const std::string& stream) const;
    void remove() const;

  private:
    std::filesystem::path dir_;
};

// The one environment of the process, set up (and VRX_INSTANCE_DIR set) on
// first use.
Environment& environment();

}  // namespace bench
