#include "programs/mailing/print_wishes.h"

namespace Mailing {
namespace {

json::Object objectIn(json::Value const& from, char const* key) {
    json::Value const found = from.isObject() ? from.toObject().get(key) : json::Value();
    return found.isObject() ? found.toObject() : json::Object();
}

/// 0 for what is none.
int numberIn(json::Object const& object, char const* key, long long most) {
    json::Value const number = object.get(key);
    return number.isInt() && number.toInt() >= 1 && number.toInt() <= most ? static_cast<int>(number.toInt())
                                                                           : 0;
}

} // namespace

PrintWishes PrintWishes::of(Cfg::PackPreset const& preset) {
    constexpr long long MAX_LENGTH = 200'000;
    json::Object const production = objectIn(preset.jAdditional(), PRODUCTION);
    json::Object const sheet = objectIn(production, SHEET);
    PrintWishes wishes;
    wishes.width = numberIn(sheet, WIDTH, MAX_LENGTH);
    wishes.height = numberIn(sheet, HEIGHT, MAX_LENGTH);
    if (int const copies = numberIn(production, COPIES, MAX_COPIES))
        wishes.copies = copies;
    json::Value const days = production.get(DUPLICATE_DAYS);
    if (days.isInt() && days.toInt() >= 0 && days.toInt() <= MAX_DUPLICATE_DAYS)
        wishes.duplicateDays = static_cast<int>(days.toInt());
    return wishes;
}

} // namespace Mailing
