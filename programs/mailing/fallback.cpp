#include "programs/mailing/fallback.h"

#include "programs/mailing/print_wishes.h"
#include "programs/protocol/carrier.h"

#include <algorithm>

namespace Mailing {
namespace {

bool hasAddress(MailedLetter const& letter, std::string const& channel) {
    return std::ranges::any_of(letter.fields, [&](auto const& each) {
        return each.second.isRcptAddress() && each.second.isValid() && each.second.name() == channel;
    });
}

} // namespace

std::vector<std::string> fallbackIn(Cfg::PackPreset const& preset) {
    json::Value const production = preset.jAdditional().isObject()
                                       ? preset.jAdditional().toObject().get(PrintWishes::PRODUCTION)
                                       : json::Value();
    json::Value const fallback = production.isObject() ? production.toObject().get(FALLBACK) : json::Value();
    std::vector<std::string> channels;
    if (!fallback.isArray() || fallback.toArray().size() > MAX_FALLBACKS)
        return channels;
    for (json::Value const& channel : fallback.toArray())
        if (Protocol::isChannelName(channel.textOrEmpty()))
            channels.push_back(channel.textOrEmpty());
    return channels;
}

std::vector<OtherWay> otherWaysOf(MailedLetter const& letter, Cfg::PackPreset const& preset) {
    std::string const first = channelOf(letter);
    std::vector<OtherWay> ways;
    for (std::string const& channel : fallbackIn(preset))
        if (channel != first && std::ranges::find(ways, channel, &OtherWay::channel) == ways.end())
            ways.push_back({channel, hasAddress(letter, channel)});
    return ways;
}

} // namespace Mailing
