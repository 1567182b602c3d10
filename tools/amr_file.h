// Reading and writing AMR-NB storage-format files (the "#!AMR\n" file magic
// followed by one table-of-contents byte and the frame's bits per 20 ms).
// Shared by the command-line tool's encode, decode and info commands.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace amrfile {

inline constexpr char kMagic[] = "#!AMR\n";
inline constexpr size_t kMagicSize = 6;

// Storage-format bytes of a frame of each frame type, table-of-contents byte
// included.  Types 9 to 14 carry no speech but still occupy these bytes.
inline constexpr int kFrameBytes[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 7, 6, 6, 1, 1, 1, 1};

// Bit rate of each codec mode in bit/s.
inline constexpr int kModeRate[8] = {4750, 5150, 5900, 6700, 7400, 7950, 10200, 12200};
inline constexpr const char *kModeName[8] = {"MR475", "MR515", "MR59", "MR67",
                                             "MR74",  "MR795", "MR102", "MR122"};

struct Frame {
    size_t offset;      // byte offset of the table-of-contents byte in the file
    int type;           // frame type 0..15
    bool good;          // quality bit
    int size;           // storage-format bytes of the frame
};

struct Parse {
    std::vector<Frame> frames;
    std::string error;          // empty when the whole file parsed
    size_t error_offset = 0;
    bool truncated = false;     // the last frame is shorter than its type needs
};

// Splits the bytes of a storage-format file into frames.  Stops at the first
// byte that cannot be a table-of-contents byte (padding bits or the F bit set)
// or at a frame that runs past the end of the data.
Parse parse(const std::vector<uint8_t> &data);

// Reads a whole file ("-" reads standard input).  Returns false and sets err.
bool read_all(const std::string &path, std::vector<uint8_t> &out, std::string &err);

}  // namespace amrfile
