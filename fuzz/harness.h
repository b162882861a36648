// A simulated appliance shared by all runs of one fuzz target.
#pragma once

#include <string>

namespace fuzzkit {

// Creates the appliance on first use: share "music" with folders a and a/b.
const std::string& Root();
std::string MusicDir();
std::string QueuePath();
void WriteFile(const std::string& path, const unsigned char* data, size_t size);
void WriteFile(const std::string& path, const std::string& text);

}  // namespace fuzzkit
