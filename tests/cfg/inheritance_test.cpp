// The matrix of own, inherited and global over every kind of field, by both routes of completion, on the real
// parts.
#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/id.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"

#include "tests/support/json_literal.h"

#include <gtest/gtest.h>

#include <array>
#include <cstddef>
#include <optional>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using namespace VLServiceTest;

/// One field: four plain values that differ from their neighbours and from the value at start, that value,
/// and the global default where there is one.
struct Row {
    char const* key;
    char const* wantedType;
    std::array<json::Value, 4> plain;
    json::Value initial;
    json::Value globalDefault = {};
};

Row textRow(char const* key, json::Value const& globalDefault = {}) {
    return {key, "string", {"one", "two", "three", "four"}, "", globalDefault};
}
Row intRow(char const* key, json::Value const& globalDefault = {}) {
    return {key, "integer", {11, -12, 13, 2147483647}, 0, globalDefault};
}
Row flagRow(char const* key, json::Value const& globalDefault = {}) {
    return {key, "boolean", {true, false, true, false}, false, globalDefault};
}

std::vector<Row> rowsOf(Cfg::App const*) {
    return {
        {"show_ctrls",
         "array",
         {"[1,0]"_json, "[0,1]"_json, "[-1,0]"_json, "[3,16383]"_json},
         "[0,0]"_json,
         "[-1,16383]"_json},
        intRow("priority_delivery"),
        textRow("db_name"),
        textRow("db_host"),
        {"print_area",
         "object",
         {R"({"left":1,"top":2,"right":3,"bottom":4})"_json,
          R"({"left":5,"top":0,"right":0,"bottom":0})"_json,
          R"({"left":-1,"top":-2,"right":-3,"bottom":-4})"_json,
          R"({"left":0,"top":0,"right":0,"bottom":9})"_json},
         "{}"_json,
         R"({"left":300,"top":300,"right":20700,"bottom":29300})"_json},
        textRow("descr"),
        textRow("dep_alias"),
        flagRow("auto_save_preset", true),
        intRow("max_letter_sheets", 999),
        flagRow("enfoce_dep"),
        flagRow("enforce_po"),
        flagRow("enforce_profile"),
        flagRow("loose_letter_deviation"),
        intRow("debug_view"),
        intRow("m"),
    };
}

std::vector<Row> rowsOf(Cfg::Inet const*) {
    return {
        textRow("help_url", "https://help.vlservice.example/"),
        textRow("contact_url", "https://vlservice.example/contact"),
        intRow("status_update_hours", 2),
        intRow("submitted_alarm_hours", 4),
        intRow("lodged_alarm_hours", 168),
        textRow("wizard_image"),
    };
}

std::vector<Row> rowsOf(Cfg::PO const*) {
    return {
        textRow("code"),
        {"expiry", "integer", {1, -2, 9223372036854775807LL, 4294967296LL}, 0},
    };
}

std::vector<Row> rowsOf(Cfg::Departments const*) {
    return {{"vals",
             "array",
             {R"(["A"])"_json, "[]"_json, R"(["B",{"name":"C","descrip":"D"}])"_json, R"(["E"])"_json},
             "[]"_json}};
}

/// The positions' enumeration of a part.
template<typename Idxs, typename Fields>
Idxs idxsOf(Cfg::Part<Idxs, Fields> const&);
template<typename Part>
using IdxsOf = decltype(idxsOf(std::declval<Part const&>()));

/// What a field holds, read by its position.
struct State {
    json::Value value;
    bool inh;
    friend bool operator==(State const&, State const&) = default;
    friend void PrintTo(State const& state, std::ostream* out) {
        *out << (state.inh ? "inherited " : "own ") << text(state.value);
    }
};

template<typename Part, std::size_t... I>
std::vector<State> states(Part const& part, std::index_sequence<I...>) {
    auto const state = [](auto const& value, bool inh) {
        return State{json::Form<std::remove_cvref_t<decltype(value)>>::write(value), inh};
    };
    return {state(part.template value<IdxsOf<Part>{I}>(), part.template isInherited<IdxsOf<Part>{I}>())...};
}
std::vector<State> statesOf(Cfg::App const& part) { return states(part, std::make_index_sequence<15>()); }
std::vector<State> statesOf(Cfg::Inet const& part) { return states(part, std::make_index_sequence<6>()); }
std::vector<State> statesOf(Cfg::PO const& part) { return states(part, std::make_index_sequence<2>()); }
std::vector<State> statesOf(Cfg::Departments const& part) {
    return states(part, std::make_index_sequence<1>());
}

enum class Given { Absent, Own, Wrapped };
constexpr Given ALL_GIVEN[] = {Given::Absent, Given::Own, Given::Wrapped};

json::Value wrapper(json::Value const& plain) { return json::Object{{"inh", true}, {"v", plain}}; }

json::Object documentWith(Row const& row, Given given, json::Value const& plain) {
    json::Object document;
    if (given != Given::Absent)
        document.set(row.key, given == Given::Own ? plain : wrapper(plain));
    return document;
}

/// The field of a part that was built from such a document.
State built(Row const& row, Given given, json::Value const& plain, bool global) {
    if (given == Given::Own)
        return {plain, false};
    if (global && row.globalDefault)
        return {row.globalDefault, true};
    return {given == Given::Wrapped ? plain : row.initial, true};
}

/// The member that serialize writes.
json::Value written(State const& state, bool global) {
    if (!state.inh)
        return state.value;
    return global ? wrapper(state.value) : json::Value();
}

template<typename Part>
class Inheritance : public testing::Test {
protected:
    static std::vector<Row> rows() { return rowsOf(static_cast<Part const*>(nullptr)); }

    static void expectField(Part const& part, std::size_t position, Row const& row, State const& expected) {
        EXPECT_EQ(statesOf(part)[position], expected);
        json::Value const document = part.serialize();
        json::Value const member = document ? document.toObject().get(row.key) : json::Value();
        EXPECT_EQ(member, written(expected, part.global())) << text(member);
    }

    /// Calls back with every field in every state, in a global part and in another.
    template<typename Check>
    static void forEveryState(Check check) {
        std::vector<Row> const all = rows();
        for (std::size_t position = 0; position < all.size(); ++position) {
            for (Given const given : ALL_GIVEN) {
                for (bool const global : {false, true}) {
                    SCOPED_TRACE(testing::Message() << all[position].key << ", state "
                                                    << static_cast<int>(given) << (global ? ", global" : ""));
                    Part const part(documentWith(all[position], given, all[position].plain[0]), global,
                                    false);
                    check(part, position, all[position],
                          built(all[position], given, all[position].plain[0], global));
                }
            }
        }
    }
};

using Parts = testing::Types<Cfg::App, Cfg::Inet, Cfg::PO, Cfg::Departments>;
TYPED_TEST_SUITE(Inheritance, Parts);

TYPED_TEST(Inheritance, FieldsStandInDeclaredOrder) {
    std::string keys;
    for (Row const& row : this->rows())
        keys += std::string(row.key) + " ";
    std::string written;
    for (auto const& [key, value] : TypeParam(json::Value(), true, false).serialize().toObject())
        written += std::string(key) + " ";
    EXPECT_EQ(written, keys);
}

TYPED_TEST(Inheritance, IsReadFromTheDocument) {
    this->forEveryState([](TypeParam const& part, std::size_t position, Row const& row, State const& before) {
        Inheritance<TypeParam>::expectField(part, position, row, before);
    });
}

TYPED_TEST(Inheritance, IsCompletedFromAParentPart) {
    this->forEveryState([](TypeParam const& part, std::size_t position, Row const& row, State const& before) {
        for (Given const given : ALL_GIVEN) {
            for (bool const global : {false, true}) {
                TypeParam const parent(documentWith(row, given, row.plain[1]), global, false);
                State const inherited{built(row, given, row.plain[1], global).value, true};
                TypeParam completed = part;
                completed.combineParent(parent);
                State const expected = before.inh ? inherited : before;
                Inheritance<TypeParam>::expectField(completed, position, row, expected);
                completed.combineParent(parent);
                Inheritance<TypeParam>::expectField(completed, position, row, expected);
            }
        }
    });
}

TYPED_TEST(Inheritance, IsCompletedFromAParentDocument) {
    this->forEveryState([](TypeParam const& part, std::size_t position, Row const& row, State const& before) {
        TypeParam completed = part;
        completed.deserializeParent(documentWith(row, Given::Absent, {}), false);
        Inheritance<TypeParam>::expectField(completed, position, row, before);
        completed.deserializeParent(documentWith(row, Given::Own, row.plain[1]), false);
        Inheritance<TypeParam>::expectField(completed, position, row,
                                            before.inh ? State{row.plain[1], true} : before);
    });
}

TYPED_TEST(Inheritance, RefusesAParentDocumentWithWrappers) {
    this->forEveryState([](TypeParam const& part, std::size_t position, Row const& row, State const& before) {
        TypeParam completed = part;
        auto const complete = [&] {
            completed.deserializeParent(documentWith(row, Given::Wrapped, row.plain[1]), false);
        };
        bool const isRect = std::string(row.wantedType) == "object";
        if (!before.inh || isRect) {
            // A wrapped rectangle passes for one without coordinates.
            complete();
            Inheritance<TypeParam>::expectField(completed, position, row,
                                                before.inh ? State{"{}"_json, true} : before);
        } else {
            EXPECT_EQ(messageOf(complete),
                      std::string("JSON error: Wrong type: object. Expected type: ") + row.wantedType);
            Inheritance<TypeParam>::expectField(completed, position, row, before);
        }
    });
}

TYPED_TEST(Inheritance, RefusesValuesOfEveryOtherType) {
    std::pair<char const*, json::Value> const values[] = {
        {"object", "{}"_json}, {"array", "[]"_json}, {"string", "x"},      {"integer", 1},
        {"float", 1.5},        {"boolean", false},   {"null", "null"_json}};
    for (Row const& row : this->rows()) {
        for (auto const& [type, value] : values) {
            SCOPED_TRACE(std::string(row.key) + " of type " + type);
            std::string const message =
                row.wantedType == std::string(type)
                    ? "nothing was thrown"
                    : std::string("JSON error: Wrong type: ") + type + ". Expected type: " + row.wantedType;
            json::Object const document{{row.key, value}};
            json::Object const wrapped{{row.key, wrapper(value)}};
            EXPECT_EQ(messageOf([&] { TypeParam(document, false, false); }), message);
            EXPECT_EQ(messageOf([&] { TypeParam(wrapped, false, false); }), message);
            EXPECT_EQ(
                messageOf([&] { TypeParam(json::Value(), false, false).deserializeParent(document, false); }),
                message);
        }
    }
}

TYPED_TEST(Inheritance, OfAWrapperWithoutAValueFailsUnlessTheTypeIsAnArray) {
    for (Row const& row : this->rows()) {
        SCOPED_TRACE(row.key);
        json::Object const document{{row.key, R"({"inh": true})"_json}};
        bool const isArray = std::string(row.wantedType) == "array";
        std::string const message =
            isArray ? "nothing was thrown"
                    : std::string("JSON error: Wrong type: empty. Expected type: ") + row.wantedType;
        EXPECT_EQ(messageOf([&] { TypeParam(document, false, false); }), message);
    }
}

TEST(ArrayFields, ReadAWrapperWithoutAValueAsNothing) {
    Cfg::App app(R"({"show_ctrls": {"inh": true}})"_json, false, false);
    EXPECT_TRUE(app.value<Cfg::AppFieldIdxs::ShowCtrls>().bits().none());
    EXPECT_TRUE(app.isInherited<Cfg::AppFieldIdxs::ShowCtrls>());
    Cfg::Departments departments(R"({"vals": {"inh": true}})"_json, false, false);
    EXPECT_TRUE(departments.empty());
    EXPECT_TRUE(departments.isInherited<Cfg::DepFieldIdxs::Vals>());
}

/// The documents of a node's chain, node first and root last. Which level has which key is told by a number:
/// its bits are the levels, and each field takes the next number, so that fields that mix up their neighbours
/// are found out.
template<typename Part>
struct Chain {
    static constexpr std::size_t LEVELS = 4;
    std::vector<Row> rows = rowsOf(static_cast<Part const*>(nullptr));
    std::vector<Cfg::Id> ids = Cfg::Id("bob/sales/acme").allIds();
    std::vector<json::Object> documents{LEVELS};
    unsigned combination;

    explicit Chain(unsigned number) : combination(number) {
        for (std::size_t position = 0; position < rows.size(); ++position) {
            for (std::size_t level = 0; level < LEVELS; ++level) {
                if (has(level, position))
                    documents[level].set(rows[position].key, rows[position].plain[level]);
            }
        }
    }
    bool has(std::size_t level, std::size_t position) const {
        return ((combination + position) >> level & 1) != 0;
    }
    /// The nearest level that has the key decides.
    State effective(std::size_t position, json::Value const& fallback) const {
        for (std::size_t level = 0; level < LEVELS; ++level) {
            if (has(level, position))
                return {rows[position].plain[level], level != 0};
        }
        return {fallback, true};
    }
};

TYPED_TEST(Inheritance, AlongTheChainOfIdsIsTheSameByBothRoutes) {
    for (unsigned combination = 0; combination < 16; ++combination) {
        SCOPED_TRACE(combination);
        Chain<TypeParam> const chain(combination);
        ASSERT_EQ(chain.ids.size(), chain.LEVELS);

        TypeParam byParts(chain.documents.back(), false, false);
        for (std::size_t level = chain.LEVELS - 1; level-- > 0;) {
            TypeParam node(chain.documents[level], false, false);
            node.combineParent(byParts);
            byParts = node;
        }
        TypeParam byDocuments(chain.documents.front(), false, false);
        for (std::size_t level = chain.LEVELS - 1; level > 0; --level)
            byDocuments.deserializeParent(TypeParam(chain.documents[level], false, false).serialize(), false);

        for (std::size_t position = 0; position < chain.rows.size(); ++position) {
            SCOPED_TRACE(chain.rows[position].key);
            State const expected = chain.effective(position, chain.rows[position].initial);
            this->expectField(byParts, position, chain.rows[position], expected);
            this->expectField(byDocuments, position, chain.rows[position], expected);
        }
    }
}

TYPED_TEST(Inheritance, AlongTheChainOfIdsEndsInTheGlobalDefaultsOfTheRoot) {
    for (unsigned combination = 0; combination < 16; ++combination) {
        SCOPED_TRACE(combination);
        Chain<TypeParam> const chain(combination);
        TypeParam part(chain.documents.back(), true, false);
        for (std::size_t level = chain.LEVELS - 1; level-- > 0;) {
            TypeParam node(chain.documents[level], false, false);
            node.combineParent(part);
            part = node;
        }
        for (std::size_t position = 0; position < chain.rows.size(); ++position) {
            SCOPED_TRACE(chain.rows[position].key);
            Row const& row = chain.rows[position];
            json::Value const fallback = row.globalDefault ? row.globalDefault : row.initial;
            this->expectField(part, position, row, chain.effective(position, fallback));
        }
    }
}

// Lists are inherited element by element.

std::string names(Cfg::Profiles const& part) {
    std::string text;
    for (auto const& element : part.elements<Cfg::ProfFieldIdxs::Vals>()) {
        text += text.empty() ? "" : " ";
        text += element.inh ? "(" + element.value.name() + ")" : element.value.name();
    }
    return text;
}

json::Object profilesDocument(std::vector<char const*> const& profileNames) {
    json::Array array;
    for (char const* name : profileNames)
        array.append(json::Object{{"name", name}});
    return {{"vals", array}};
}

TEST(ListInheritance, AlongTheChainOfIdsDiffersByRoute) {
    std::vector<json::Object> const documents{
        profilesDocument({"U1", "U2"}), profilesDocument({"G"}), {}, profilesDocument({"R1", "R2"})};
    ASSERT_EQ(Cfg::Id("bob/sales/acme").allIds().size(), documents.size());

    Cfg::Profiles byParts(documents.back(), true, false);
    for (std::size_t level = documents.size() - 1; level-- > 0;) {
        Cfg::Profiles node(documents[level], false, false);
        node.combineParent(byParts);
        byParts = node;
    }
    EXPECT_EQ(names(byParts), "U1 U2 (G) (R1) (R2)");

    Cfg::Profiles byDocuments(documents.front(), false, false);
    for (std::size_t level = documents.size() - 1; level > 0; --level)
        byDocuments.deserializeParent(documents[level], false);
    EXPECT_EQ(names(byDocuments), "U1 U2 (R1) (R2) (G)");

    for (Cfg::Profiles const* part : {&byParts, &byDocuments})
        EXPECT_EQ(text(part->serialize()), R"({"vals":[{"name":"U1"},{"name":"U2"}]})");
}

TEST(ListInheritance, IsOfOwnAndWrappedElementsInGlobalPartsAndOthers) {
    auto const document =
        R"({"vals": [{"name": "P"}, {"inh": true, "v": {"name": "Q", "descrip": "q"}}]})"_json;
    for (bool const global : {false, true}) {
        Cfg::Profiles part(document, global, false);
        EXPECT_EQ(names(part), "P (Q)");
        EXPECT_EQ(text(part.serialize()),
                  global ? R"({"vals":[{"name":"P"},{"inh":true,"v":{"name":"Q","descrip":"q"}}]})"
                         : R"({"vals":[{"name":"P"}]})");
        part.combineParent(Cfg::Profiles(profilesDocument({"R"}), true, false));
        EXPECT_EQ(names(part), "P (R)");
        part.deserializeParent(document, false);
        EXPECT_EQ(names(part), "P (R) (P) (Q)");
    }
}

} // namespace
