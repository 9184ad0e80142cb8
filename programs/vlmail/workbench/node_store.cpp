// The settings of a node, which the service keeps.
#include "programs/base/digest.h"
#include "programs/protocol/settings.h"
#include "programs/vlmail/golden/expectation.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/workbench/request.h"
#include "programs/vlmail/workbench/settings_store.h"
#include "vlservice/json/json_text.h"
#include "vlservice/presets/settings_parts.h"

#include <utility>

namespace VlMail::Workbench {
namespace {

using Protocol::SettingsAnswer;

/// What the node has of its own, by the names of parts.
json::Object ownOf(SettingsAnswer const& answer) {
    json::Object own;
    for (Cfg::PartInfo const& part : Cfg::settingsParts())
        if (json::Object const values = answer.part(part.name).own; !values.empty())
            own.set(part.name, values);
    return own;
}

/// Parts in one order, however they came.
std::string versionOf(json::Object const& own) {
    std::string text;
    for (Cfg::PartInfo const& part : Cfg::settingsParts())
        if (json::Value const values = own.get(part.name))
            text += part.name + json::toText(values);
    return Base::sha256(text);
}

std::string textOf(json::Object const& own) {
    static json::Object const nothing{
        {Cfg::Presets::PART_NAME.c_str(),
         json::Object{{"extract_presets", json::Array()}, {"pack_presets", json::Array()}}}};
    std::string text = printed(own.empty() ? nothing : own);
    if (text.size() > MAX_BODY_BYTES)
        throw Base::Error(Base::Code::TooLarge, "the node has more settings than a workbench can hold; let "
                                                "nodes above it have some of them");
    return text;
}

bool hasOrigin(json::Value const& origin, std::string const& node) {
    if (!origin.isArray())
        return origin.isString() && origin.textOrEmpty() == node;
    for (json::Value const& one : origin.toArray())
        if (hasOrigin(one, node))
            return true;
    return false;
}

/// A service that does not know the question for what is inherited tells what counts.
SettingsAnswer inherited(SettingsAnswer answer) {
    json::Object parts;
    for (auto const& [name, told] : answer.parts) {
        Protocol::PartSettings part(told.toObject());
        for (auto const& [key, origin] : part.origins)
            if (hasOrigin(origin, answer.id))
                throw Base::Error(Base::Code::ServiceOutdated,
                                  "the service does not tell what a node inherits; update it to work with "
                                  "the settings of its nodes");
        part.own = {};
        parts.set(name, part.serialize());
    }
    answer.parts = parts;
    return answer;
}

class OfNode : public SettingsStore {
public:
    OfNode(std::string nodeId, std::string name, ServiceLine::Connect connect)
        : nodeId_(std::move(nodeId)), name_(std::move(name)), connect_(std::move(connect)) {}

    char const* kind() const override { return "node"; }
    std::string name() const override { return name_; }

    StoredSettings read() override {
        SettingsAnswer const answer = fetch(*connect_());
        json::Object const own = ownOf(answer);
        return {textOf(own), versionOf(own), json::toText(inherited(answer).serialize())};
    }

    StoredSettings write(std::string const& text, std::string const& version) override {
        auto const service = connect_();
        SettingsAnswer const answer = fetch(*service);
        json::Object const was = ownOf(answer);
        if (versionOf(was) != version)
            throw settingsChanged();
        // Whoever changes them from here on is noticed by the service.
        Protocol::SettingsReplacedAnswer const stored(
            ask(*service, Protocol::SettingsReplacement(nodeId_, was, ownIn(text))));
        return {text, versionOf(stored.own), json::toText(inherited(answer).serialize())};
    }

private:
    SettingsAnswer fetch(Channel::Client& service) const {
        Protocol::SettingsQuery query(nodeId_, {});
        query.carriers = true;
        query.inherited = true;
        return SettingsAnswer(ask(service, query));
    }

    json::Object ownIn(std::string const& text) const {
        NodeSettings const written = NodeSettings::fromText(text, name_);
        json::Object own;
        for (Cfg::PartInfo const& part : Cfg::settingsParts())
            if (json::Value const values = written.part(part.name))
                own.set(part.name, values);
        return own;
    }

    std::string nodeId_;
    std::string name_;
    ServiceLine::Connect connect_;
};

} // namespace

std::unique_ptr<SettingsStore> settingsOfNode(std::string nodeId, std::string name,
                                              ServiceLine::Connect connect) {
    return std::make_unique<OfNode>(std::move(nodeId), std::move(name), std::move(connect));
}

} // namespace VlMail::Workbench
