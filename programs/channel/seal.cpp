#include "programs/channel/seal.h"

#include "programs/channel/proof.h"

namespace Channel {

std::string Seal::next(std::string_view message) {
    std::string number;
    for (int shift = 56; shift >= 0; shift -= 8)
        number += static_cast<char>(number_ >> shift & 0xff);
    ++number_;
    return hmac(hmac(key_, number), message);
}

} // namespace Channel
