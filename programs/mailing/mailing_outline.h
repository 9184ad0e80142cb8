#pragma once
// What a mailing's metadata says beside the values of its letters, for whoever takes in mailings of
// strangers: no tree of all letters is built, which takes many times the memory and the time of their text.

#include "vlservice/pack/shared_mem_buffer.h"
#include "vlservice/presets/pack_preset.h"

#include <string>
#include <string_view>
#include <vector>

namespace Mailing {

/// A letter as the register of letters knows it.
struct LetterDigest {
    /// 64 hexadecimal digits.
    std::string digest;
    /// From 1, the place in the mailing of what it goes out in.
    long long number = 0;
};

struct MailingOutline {
    Cfg::PackPreset packPreset;
    /// Of paper, of the letter with the most: each document begins on a front side, and a blank page is the
    /// other side of the one in front of it.
    long long mostSheets = 0;
    /// None in the mailings of older clients.
    std::vector<LetterDigest> digests = {};
    /// As of Metadata.
    std::string again = {};
};

/// Of the JSON text. Throws std::exception when it is none of a mailing; what it passes over may be anything
/// that is as long as its brackets and quotes say.
MailingOutline outlineIn(std::string_view text);

/// Of metadata as a container holds it. More than 256 MiB are none.
MailingOutline outlineOf(SharedMemBuffer metadata);

} // namespace Mailing
