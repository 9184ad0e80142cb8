#include "programs/reader/geometry.h"

namespace Reader {

Frame frameOf(Box const& box, Turn turn) {
    switch (turn) {
    case Turn::Upright:
        break;
    case Turn::Down:
        return {box.top, box.bottom, -box.right, -box.left};
    case Turn::UpsideDown:
        return {-box.right, -box.left, -box.bottom, -box.top};
    case Turn::Up:
        return {-box.bottom, -box.top, box.left, box.right};
    }
    return {box.left, box.right, box.top, box.bottom};
}

Box partAlong(Box const& box, Turn turn, double from, double to) {
    auto const at = [](int zero, int one, double share) {
        return static_cast<int>(std::lround(zero + (one - zero) * share));
    };
    switch (turn) {
    case Turn::Upright:
        break;
    case Turn::Down:
        return {box.left, at(box.top, box.bottom, from), box.right, at(box.top, box.bottom, to)};
    case Turn::UpsideDown:
        return {at(box.right, box.left, to), box.top, at(box.right, box.left, from), box.bottom};
    case Turn::Up:
        return {box.left, at(box.bottom, box.top, to), box.right, at(box.bottom, box.top, from)};
    }
    return {at(box.left, box.right, from), box.top, at(box.left, box.right, to), box.bottom};
}

} // namespace Reader
