// The report of a document and the workbench show the same of it: marks, pictures, and what goes out along.
#include "programs/base/digest.h"
#include "programs/vlmail/report/html.h"
#include "programs/vlmail/workbench/desk.h"

#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <gmock/gmock.h>
#include <iterator>
#include <ostream>
#include <regex>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using namespace VlMail;
using testing::Contains;
using testing::ElementsAre;
using testing::Not;
using testing::SizeIs;

std::string textOf(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

/// Short enough for a line.
std::string shortened(std::string const& picture) { return picture.empty() ? "none" : Base::sha256(picture); }

/// A sheet or a side: its picture, its size, and what lies on it, all as a report has it.
struct DrawnSheet {
    std::string size;
    std::string picture;
    std::vector<std::string> marks = {};
    std::string name = {};

    friend bool operator==(DrawnSheet const&, DrawnSheet const&) = default;
    friend void PrintTo(DrawnSheet const& sheet, std::ostream* out) {
        *out << sheet.size << ' ' << sheet.name << ' ' << testing::PrintToString(sheet.marks) << " picture "
             << sheet.picture;
    }
};

struct Drawn {
    std::vector<DrawnSheet> sheets = {};
    std::vector<DrawnSheet> sides = {};
};

/// The parts of a text that begin with `begin` and end before `end`.
std::vector<std::string> between(std::string const& text, std::string const& begin, std::string const& end) {
    std::vector<std::string> parts;
    for (std::size_t at = text.find(begin); at != text.npos; at = text.find(begin, at + 1))
        parts.push_back(
            text.substr(at + begin.size(), text.find(end, at + begin.size()) - at - begin.size()));
    return parts;
}

std::string firstBetween(std::string const& text, std::string const& begin, std::string const& end) {
    std::vector<std::string> const parts = between(text, begin, end);
    return parts.empty() ? "" : parts.front();
}

std::string pictureIn(std::string const& html) { return shortened(firstBetween(html, "src=\"", "\"")); }

/// A mark of a report without where it leads.
std::string markIn(std::string const& link) {
    return std::regex_replace(link, std::regex(" (id|href)=\"[^\"]*\""), "");
}

DrawnSheet sheetIn(std::string const& figure) {
    DrawnSheet sheet{firstBetween(figure, "class=\"sheet\" style=\"", "\""), pictureIn(figure)};
    for (std::string const& link : between(figure, "<a ", "</a>"))
        sheet.marks.push_back(markIn(' ' + link));
    return sheet;
}

Drawn drawnIn(std::string const& report) {
    Drawn drawn;
    for (std::string const& figure : between(report, "<figure>", "<figcaption>"))
        drawn.sheets.push_back(sheetIn(figure));
    for (std::string const& side : between(report, "<li><div class=\"side\"", "</li>"))
        drawn.sides.push_back({firstBetween(side, "style=\"", "\""),
                               pictureIn(side),
                               {},
                               firstBetween(side, "<bdi>", "</bdi>")});
    return drawn;
}

/// A folder with one document, its settings, and what its pack preset names.
struct Shown {
    fs::path folder;
    std::string document;
    fs::path settings;
    fs::path documents = {};
};

Drawn reported(Shown const& shown) {
    TemporaryFolder const folder;
    std::string const file = (folder.path() / "report.html").string();
    std::vector<std::string> arguments{"letter",     (shown.folder / shown.document).string(),
                                       "--settings", shown.settings.string(),
                                       "--report",   file};
    if (!shown.documents.empty())
        arguments.insert(arguments.end(), {"--documents", shown.documents.string()});
    runVlMail(arguments);
    return drawnIn(textOf(file));
}

/// What the page of the workbench draws out of its answers.
class WorkbenchDrawing {
public:
    explicit WorkbenchDrawing(Shown const& shown)
        : shown_(shown), text_(textOf(shown.settings)), desk_({shown.folder, shown.documents}) {}

    Drawn drawn() {
        Drawn drawn;
        json::Object const told = ask("evaluate", {{"checks", json::Value(json_true())}});
        for (json::Value const& one : told.get("letters").toArray()) {
            json::Object const letter = one.toObject();
            for (json::Value const& sheet : letter.get("sheets").toArray())
                drawn.sheets.push_back(sheetOf(sheet.toObject()));
            long long const page = letter.get("pages").toArray().at(0).toInt();
            for (json::Value const& side : letter.get("sides").toArray())
                drawn.sides.push_back(sideOf(side.toObject(), page));
        }
        return drawn;
    }

private:
    Workbench::Answer answer(std::string const& what, json::Object query) {
        query.set("document", shown_.document);
        query.set("settings", text_);
        return desk_.answer(what, json::toText(query));
    }
    json::Object ask(std::string const& what, json::Object const& query) {
        Workbench::Answer const got = answer(what, query);
        return json::strToObject(got.body.data(), got.body.size());
    }
    std::string picture(json::Object const& query) {
        Workbench::Answer const got = answer("picture", query);
        EXPECT_EQ(got.status, 200) << got.body;
        return shortened(got.body.empty() ? "" : Report::pngUri(got.body));
    }
    static std::string sizeOf(json::Object const& one) {
        return "--w:" + std::to_string(one.get("width").toInt()) +
               ";--h:" + std::to_string(one.get("height").toInt());
    }
    DrawnSheet sheetOf(json::Object const& sheet) {
        DrawnSheet drawn{sizeOf(sheet), picture({{"page", sheet.get("page")}, {"dots", 110}})};
        for (json::Value const& shape : sheet.get("shapes").toArray())
            drawn.marks.push_back(markOf(shape.toObject(), sheet));
        return drawn;
    }
    static std::string markOf(json::Object const& shape, json::Object const& sheet) {
        json::Object const box = shape.get("box").toObject();
        auto const part = [&](char const* from, char const* to, char const* whole) {
            auto const begin = from ? box.get(from).toInt() : 0;
            return Report::percent(static_cast<double>(box.get(to).toInt() - begin),
                                   static_cast<double>(sheet.get(whole).toInt()));
        };
        std::string const tag = shape.get("tag").toString();
        return std::string(" class=\"") + shape.get("look").toString() + std::string("\" style=\"left:") +
               part(nullptr, "left", "width") + ";top:" + part(nullptr, "top", "height") +
               ";width:" + part("left", "right", "width") + ";height:" + part("top", "bottom", "height") +
               "\" aria-label=\"" + Report::escaped(shape.get("label").toString()) + "\">" +
               (tag.empty() ? "" : "<span class=\"tag\">" + Report::isolated(tag) + "</span>");
    }
    DrawnSheet sideOf(json::Object const& side, long long page) {
        std::string const kind = side.get("kind").toString();
        std::string const number = "page " + std::to_string(side.get("page").toInt());
        std::string name = kind == "page" ? number
                           : kind == "attachment"
                               ? number + std::string(" of \"") + side.get("id").toString() + '"'
                           : kind == "cover" ? "cover page"
                                             : "blank side";
        return {sizeOf(side),
                kind == "blank" ? shortened("") : picture({{"page", page}, {"dots", 36}, {"side", side}}),
                {},
                Report::escaped(name)};
    }

    Shown const& shown_;
    std::string const text_;
    Workbench::Desk desk_;
};

std::vector<Shown> shownExamples() {
    std::vector<Shown> all;
    fs::path const examples = fs::path(SOURCE_FOLDER) / "examples";
    for (char const* const document : {"Invoice 17.pdf", "Invoices March.pdf"})
        all.push_back({examples / "office", document, examples / "office/settings.json"});
    for (fs::directory_entry const& entry : fs::directory_iterator(examples / "broken"))
        if (fs::exists(entry.path() / "settings.json"))
            for (char const* const document : {"invoice 17.pdf", "invoice 17.txt"})
                if (fs::exists(entry.path() / document))
                    all.push_back({entry.path(), document, entry.path() / "settings.json"});
    std::ranges::sort(all, {}, &Shown::folder);
    return all;
}

TEST(WorkbenchDrawings, AreThoseOfTheReportForTheExamples) {
    std::vector<Shown> const examples = shownExamples();
    EXPECT_THAT(examples, SizeIs(testing::Gt(10U)));
    for (Shown const& shown : examples) {
        SCOPED_TRACE(shown.folder.string());
        std::vector<DrawnSheet> const sheets = reported(shown).sheets;
        EXPECT_THAT(sheets, Not(Contains(testing::Field(&DrawnSheet::marks, testing::IsEmpty()))));
        EXPECT_EQ(WorkbenchDrawing(shown).drawn().sheets, sheets);
    }
}

class PrintedDrawings : public testing::Test {
protected:
    PrintedDrawings() {
        fs::create_directory(folder_.path() / "letters");
        fs::create_directory(folder_.path() / "parts");
        write("letters/a.txt",
              "\n\n\n\n\nAda Brook\n14 Mill Lane\nHEBDEN BRIDGE\nHX7 8AB\n\n\n\nDear Ada,\f2\f3");
        write("parts/head.txt", "\n\n                               THE MILL");
        write("parts/terms.txt", "Terms\fmore of them");
    }
    void write(char const* name, std::string const& text) const {
        std::ofstream(folder_.path() / name) << text;
    }
    /// With these keys of the pack preset.
    Shown with(std::string const& keys) const {
        write("node.json", R"({"extract_presets": [{"match": ".*", "pack_preset": "P", "zones": [
            {"name": "Address", "location": {"left": 2000, "top": 3000, "right": 9000, "bottom": 6500}, "fields": [
             {"name": "postal", "value_extract": "\\A(?<VAL>(.{1,72}\\n){1,8}.{1,72})\\Z", "priority": 1, "send_to_server": true}]}]}],
            "pack_presets": [{"name": "P", )" +
                               keys + "}]}");
        return {folder_.path() / "letters", "a.txt", folder_.path() / "node.json", folder_.path() / "parts"};
    }

    TemporaryFolder const folder_;
};

constexpr char const* ALL_SIDES = R"("duplex": true, "letterheads": ["head"], "attachments": ["terms"],
    "production": {"repair": ["cover-page"], "window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}})";

TEST_F(PrintedDrawings, AreThoseOfTheReportWithAllThatGoesOutWithALetter) {
    Shown const shown = with(ALL_SIDES);
    Drawn const report = reported(shown);
    std::vector<std::string> names;
    for (DrawnSheet const& side : report.sides)
        names.push_back(side.name);
    EXPECT_THAT(names, ElementsAre("cover page", "blank side", "page 1", "page 2", "page 3", "blank side",
                                   "page 1 of &quot;terms&quot;", "page 2 of &quot;terms&quot;"));
    Drawn const workbench = WorkbenchDrawing(shown).drawn();
    EXPECT_EQ(workbench.sheets, report.sheets);
    EXPECT_EQ(workbench.sides, report.sides);
}

TEST_F(PrintedDrawings, AreThoseOfTheReportOnPagesThatAreTurned) {
    Shown const shown = with(R"("orientation": 2)");
    std::vector<DrawnSheet> const sheets = reported(shown).sheets;
    ASSERT_FALSE(sheets.empty());
    EXPECT_EQ(sheets.front().size, "--w:29700;--h:21000");
    EXPECT_EQ(WorkbenchDrawing(shown).drawn().sheets, sheets);
}

TEST_F(PrintedDrawings, HaveFindingsWhereTheReportHasThem) {
    Shown const shown =
        with(R"("production": {"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}})");
    std::vector<DrawnSheet> const sheets = reported(shown).sheets;
    ASSERT_FALSE(sheets.empty());
    EXPECT_THAT(sheets.front().marks, Contains(testing::StartsWith(" class=\"fault\"")));
    EXPECT_EQ(WorkbenchDrawing(shown).drawn().sheets, sheets);
}

class DeskOfTurnedPages : public PrintedDrawings {
protected:
    json::Object evaluate(Shown const& shown, bool isChecked) {
        json::Object const query{{"document", shown.document},
                                 {"settings", textOf(shown.settings)},
                                 {"checks", json::Value(isChecked ? json_true() : json_false())}};
        Workbench::Desk desk({shown.folder, shown.documents});
        Workbench::Answer const got = desk.answer("evaluate", json::toText(query));
        return json::strToObject(got.body.data(), got.body.size());
    }
    static json::Object letterIn(json::Object const& told) {
        return told.get("letters").toArray().at(0).toObject();
    }
};

TEST_F(DeskOfTurnedPages, TellsZonesAsSettingsHaveThem) {
    json::Object const told = evaluate(with(R"("orientation": 2)"), false);
    EXPECT_EQ(json::toText(told.get("turned")), R"({"1":1,"2":1,"3":1})");
    json::Object const zone = letterIn(told).get("zones").toArray().at(0).toObject();
    EXPECT_EQ(json::toText(zone.get("box")), R"({"left":2000,"top":3000,"right":9000,"bottom":6500})");
}

TEST_F(DeskOfTurnedPages, TellsWhatGoesOutBehindTheFirstAnswer) {
    Shown const shown = with(ALL_SIDES);
    EXPECT_EQ(json::toText(letterIn(evaluate(shown, false)).get("sides")), "null");
    EXPECT_EQ(letterIn(evaluate(shown, true)).get("sides").toArray().size(), 8U);
}

TEST_F(DeskOfTurnedPages, MarkPagesThatWouldBePrintedOtherwise) {
    auto const mark = [&](std::string const& keys) {
        return evaluate(with(keys), true).get("printed").textOrEmpty();
    };
    std::string const first = mark(R"("letterheads": ["head"])");
    EXPECT_EQ(mark(R"("letterheads": ["head"])"), first);
    EXPECT_NE(mark(R"("letterheads": [{"id": "head", "skip_letters": true}])"), first);
    write("parts/head.txt", "\n\nANOTHER MILL");
    EXPECT_NE(mark(R"("letterheads": ["head"])"), first);
}

TEST_F(DeskOfTurnedPages, FollowsLetterheadsThatChange) {
    Shown const shown = with(R"("letterheads": ["head"])");
    Workbench::Desk desk({shown.folder, shown.documents});
    auto const picture = [&] {
        return desk.answer("picture", json::toText(json::Object{{"document", shown.document},
                                                                {"settings", textOf(shown.settings)},
                                                                {"page", 1},
                                                                {"dots", 40}}));
    };
    std::string const first = picture().body;
    EXPECT_EQ(picture().body, first);
    write("parts/head.txt", "\n\n\n\n\n\n\nANOTHER MILL, FURTHER DOWN");
    std::string const second = picture().body;
    EXPECT_NE(second, first);
    fs::remove(folder_.path() / "parts/head.txt");
    EXPECT_NE(picture().body, second);
}

TEST_F(DeskOfTurnedPages, DrawsWhatTheDocumentAndTheSettingsAreByThen) {
    Shown const shown = with(R"("title": "as it is")");
    Workbench::Desk desk({shown.folder, shown.documents});
    auto const picture = [&] {
        return desk
            .answer("picture", json::toText(json::Object{{"document", shown.document},
                                                         {"settings", textOf(shown.settings)},
                                                         {"page", 1},
                                                         {"dots", 40}}))
            .body;
    };
    std::string const first = picture();
    with(R"("orientation": 2)");
    std::string const turned = picture();
    EXPECT_NE(turned, first);
    with(R"("title": "as it is")");
    EXPECT_EQ(picture(), first);
    write("letters/a.txt", "\n\nAnother letter altogether");
    EXPECT_NE(picture(), first);
}

TEST_F(DeskOfTurnedPages, RefusesSidesThatAreNone) {
    Shown const shown = with(ALL_SIDES);
    Workbench::Desk desk({shown.folder, shown.documents});
    for (char const* const side :
         {R"({"kind":"attachment","page":3,"attachment":0})", R"({"kind":"page","page":9,"attachment":0})",
          R"({"kind":"attachment","page":1,"attachment":9})", R"({"kind":"lid","page":1,"attachment":0})",
          R"({"kind":"page","page":-1,"attachment":0})", R"({"kind":1})"}) {
        std::string const text(side);
        json::Object const query{{"document", shown.document},
                                 {"settings", textOf(shown.settings)},
                                 {"page", 1},
                                 {"dots", 40},
                                 {"side", json::strToObject(text.data(), text.size())}};
        EXPECT_EQ(desk.answer("picture", json::toText(query)).status, 400) << side;
    }
}

} // namespace
