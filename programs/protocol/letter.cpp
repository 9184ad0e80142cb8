#include "programs/protocol/letter.h"

#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <iterator>

namespace Protocol {
namespace {

constexpr std::pair<LetterState, char const*> STATES[] = {
    {LetterState::Waiting, "waiting"},     {LetterState::HandedOver, "handed over"},
    {LetterState::Accepted, "accepted"},   {LetterState::Delivered, "delivered"},
    {LetterState::Returned, "returned"},   {LetterState::Failed, "failed"},
    {LetterState::Uncertain, "uncertain"}, {LetterState::Held, "held"},
};
static_assert(std::size(STATES) == ALL_LETTER_STATES.size());

constexpr char const* ACTION = "action";

constexpr std::pair<LetterAction, char const*> ACTIONS[] = {
    {LetterAction::SettleDelivered, "delivered"},
    {LetterAction::SettleFailed, "failed"},
    {LetterAction::Resend, "resend"},
};

class StateKey {
public:
    constexpr explicit StateKey(char const* name) : name_(name) {}

    void read(json::Object const& from, auto& into) const {
        into.state = letterStateNamed(from.get(name_).textOrEmpty());
    }
    void write(auto const& from, json::Object& into) const { into.set(name_, letterStateName(from.state)); }

private:
    char const* name_;
};

} // namespace

struct LetterReport::Keys {
    static constexpr std::tuple TABLE{
        Always{"number", &LetterReport::number},   Always{"key", &LetterReport::key},
        Always{"channel", &LetterReport::channel}, StateKey{"state"},
        Always{"says", &LetterReport::says},       Always{"changed", &LetterReport::changed},
        json::Key{"tried", &LetterReport::tried},
    };
};

struct NoticeReport::Keys {
    static constexpr std::tuple TABLE{
        Always{"number", &NoticeReport::number},    Always{"key", &NoticeReport::key},
        json::Key{"letter", &NoticeReport::letter}, StateKey{"state"},
        Always{"says", &NoticeReport::says},        Always{"changed", &NoticeReport::changed},
    };
};

struct LetterChange::Keys {
    /// "action" is not among them.
    static constexpr std::tuple TABLE{
        Asked{"id", &LetterChange::id, TextForm{}},
        Asked{"letter", &LetterChange::letter, IntegerForm{.lowest = 1}},
        Asked{"notice", &LetterChange::notice, IntegerForm{.lowest = 1}},
    };
};

char const* letterStateName(LetterState state) {
    return std::ranges::find(STATES, state, &std::pair<LetterState, char const*>::first)->second;
}

LetterState letterStateNamed(std::string const& name) {
    auto const found = std::ranges::find(STATES, name, &std::pair<LetterState, char const*>::second);
    if (found == std::end(STATES))
        throw Base::Error(Base::Code::VersionMismatch,
                          "there is a letter in the state \"" + name +
                              "\", which this program does not know: use the version that wrote it");
    return found->first;
}

LetterReport::LetterReport(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object LetterReport::serialize() const { return writeRecord(*this); }

NoticeReport::NoticeReport(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object NoticeReport::serialize() const { return writeRecord(*this); }

LetterChange::LetterChange(LetterAction wanted, std::string packId, long long ofLetter, long long ofNotice)
    : action(wanted), id(std::move(packId)), letter(ofLetter), notice(ofNotice) {}

LetterChange::LetterChange(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    std::string const name = object.get(ACTION).textOrEmpty();
    auto const found = std::ranges::find_if(ACTIONS, [&](auto const& row) { return row.second == name; });
    if (found == std::end(ACTIONS))
        throw Base::Error(Base::Code::RequestInvalid,
                          "\"action\" of a change of a letter has to be \"delivered\", \"failed\" or "
                          "\"resend\"");
    action = found->first;
    if (id.empty() || (letter == 0) == (notice == 0))
        throw Base::Error(
            Base::Code::RequestInvalid,
            "a change of a letter needs the \"id\" of its mailing and its number, \"letter\", or "
            "that of a notice, \"notice\"");
}

json::Object LetterChange::serialize() const {
    json::Object object = question(KIND);
    object.set(ACTION,
               std::ranges::find(ACTIONS, action, &std::pair<LetterAction, char const*>::first)->second);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

} // namespace Protocol
