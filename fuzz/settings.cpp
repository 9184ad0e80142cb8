// A node's settings and its parent's by part, and the node's name: {"id": ..., "settings": {"app": ..., ...},
// "parent":
// {"app": ..., ...}}. Read, completed by both routes, written; the name is completed and walked to the root.
#include "vlservice/cfg/app.h"
#include "vlservice/cfg/cfg_node_id.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/id.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/json/json_text.h"

#include <cstdint>
#include <cstdlib>
#include <sstream>
#include <string>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

json::Value memberOf(json::Value const& object, std::string const& key) {
    return object.isObject() ? object.toObject().get(key) : json::Value();
}

template<typename Part>
void checkPart(json::Value const& settings, json::Value const& parentSettings) {
    Part const root(memberOf(parentSettings, Part::PART_NAME), true, false);
    json::Value const rootForm = root.serialize();
    require(Part(rootForm, true, false).serialize() == rootForm);

    // The written form has own values only, and own list elements in front.
    json::Value const written = Part(memberOf(settings, Part::PART_NAME), false, false).serialize();
    Part const node(written, false, false);
    require(node.serialize() == written);

    Part byPart = node;
    byPart.combineParent(root);
    require(byPart.serialize() == written);
    Part again = byPart;
    again.combineParent(root);
    require(again.serialize() == written);

    Part byDocument = node;
    byDocument.deserializeParent(Part(memberOf(parentSettings, Part::PART_NAME), false, false).serialize(),
                                 false);
    require(byDocument.serialize() == written);

    std::ostringstream printed;
    printed << rootForm;
}

void checkId(std::string const& path) {
    // The chain takes memory in the square of the length.
    if (path.size() > 2000)
        return;
    Cfg::Id const id(path, true);
    for (Cfg::Id const& step : id.allIds()) {
        require(Cfg::CfgNodeId(step).asCfgId() == step);
        require(step.str().size() <= id.str().size());
    }
    for (std::string const& token : id.tokens())
        require(Cfg::Id::tokenValue(token).size() <= token.size());
    require(Cfg::Id("", false).isParentOrEqual(id));
    require(id.valid());
}

void check(json::Object const& input) {
    checkId(input.get("id").textOrEmpty());
    json::Value const settings = input.get("settings");
    json::Value const parent = input.get("parent");
    checkPart<Cfg::App>(settings, parent);
    checkPart<Cfg::Inet>(settings, parent);
    checkPart<Cfg::PO>(settings, parent);
    checkPart<Cfg::Departments>(settings, parent);
    checkPart<Cfg::Profiles>(settings, parent);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    try {
        check(json::strToObject(reinterpret_cast<char const*>(data), size));
    } catch (json::Exc const&) { // bad JSON, or values of wrong types
    }
    return 0;
}
