#pragma once
// A mailing file in all the ways in which disks, transports and people damage one.

#include <string>
#include <vector>

namespace VLServiceTest {

struct DamagedMailing {
    /// Such as "cut behind 117 bytes", "pages 1 and 2 change names".
    std::string how;
    std::string bytes;
};

/// Of the bytes of a whole mailing of several pages, in the layout that is written: cut at every place where
/// something begins or ends and within it, changed by a bit in each part of blobs, index and trailer, with
/// pages, names and entries changed for each other, missing, doubled, and with a stretch of zeroes.
std::vector<DamagedMailing> damagesOf(std::string const& mailing);

} // namespace VLServiceTest
