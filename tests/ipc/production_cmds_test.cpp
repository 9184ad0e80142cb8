// The commands about production: their JSON in both directions.

#include "tests/ipc/json_steps.h"

#include "vlservice/ipc/gui_fwd.h"
#include "vlservice/ipc/price_est.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/update_status.h"
#include "vlservice/ipc/upload_queued.h"

#include <gmock/gmock.h>

using namespace testing;

namespace {

constexpr auto NO_STRING = "JSON error: Wrong type: empty. Expected type: string";

// --- PriceEst

TEST(PriceEst, CarriesObjectsBothWays) {
    Ipc::PriceEst cmd(nullptr, {{"sheets", 3}});
    EXPECT_EQ(reqOf(cmd), R"({"sheets":3})");
    Ipc::PriceEst received(nullptr);
    EXPECT_EQ(text(received.reqParams()), "{}");
    readReq(received, reqOf(cmd));
    EXPECT_EQ(text(received.reqParams()), R"({"sheets":3})");
    received.setResp({{"cents", 240}});
    EXPECT_EQ(respOf(received), R"({"cents":240})");
    readResp(cmd, respOf(received));
    EXPECT_EQ(text(cmd.resp()), R"({"cents":240})");
}

TEST(PriceEst, HasNoParametersLeftAfterAResponse) {
    Ipc::PriceEst cmd(nullptr, {{"sheets", 3}});
    EXPECT_EQ(&cmd.reqParams(), &cmd.resp());
    readResp(cmd, "{}");
    EXPECT_EQ(text(cmd.reqParams()), "{}");
}

// --- ProcessPack

TEST(ProcessPack, AlwaysWritesAllThreeKeys) {
    EXPECT_EQ(reqOf(Ipc::ProcessPack(nullptr, "db:5984", "packs", "p1")),
              R"({"db_conn":"db:5984","db_name":"packs","id":"p1"})");
    EXPECT_EQ(reqOf(Ipc::ProcessPack(nullptr)), R"({"db_conn":"","db_name":"","id":""})");
}

TEST(ProcessPack, ReadsAllThreeKeys) {
    Ipc::ProcessPack cmd(nullptr);
    readReq(cmd, R"({"db_conn":"db:5984","db_name":"packs","id":"p1"})");
    EXPECT_EQ(cmd.dbHostPort(), "db:5984");
    EXPECT_EQ(cmd.dbName(), "packs");
    EXPECT_EQ(cmd.packId(), "p1");
}

TEST(ProcessPack, WithoutAnIdFailsAfterTheDatabaseHasBeenStored) {
    Ipc::ProcessPack cmd(nullptr, "old", "old", "old");
    EXPECT_EQ(jsonError([&] { readReq(cmd, R"({"db_conn":"db","db_name":"packs"})"); }), NO_STRING);
    EXPECT_EQ(cmd.dbHostPort(), "db");
    EXPECT_EQ(cmd.dbName(), "packs");
    EXPECT_EQ(cmd.packId(), "old");
}

TEST(ProcessPack, FailsAtTheFirstKeyThatIsNoText) {
    Ipc::ProcessPack cmd(nullptr, "old", "old", "old");
    EXPECT_EQ(jsonError([&] { readReq(cmd, R"({"db_conn":1,"db_name":"packs","id":"p"})"); }),
              "JSON error: Wrong type: integer. Expected type: string");
    EXPECT_EQ(cmd.dbName(), "old");
    EXPECT_EQ(jsonError([&] { readReq(cmd, R"({"db_conn":"db","db_name":null,"id":"p"})"); }),
              "JSON error: Wrong type: null. Expected type: string");
    EXPECT_EQ(cmd.dbHostPort(), "db");
    EXPECT_EQ(cmd.packId(), "old");
}

// --- UploadQueued and UpdateStatus

template<typename Cmd>
class CmdNamingADatabase : public Test {};
using CmdsNamingADatabase = Types<Ipc::UploadQueued, Ipc::UpdateStatus>;
TYPED_TEST_SUITE(CmdNamingADatabase, CmdsNamingADatabase);

TYPED_TEST(CmdNamingADatabase, AlwaysWritesBothKeys) {
    EXPECT_EQ(reqOf(TypeParam(nullptr, "db", "packs")), R"({"db_host":"db","db_name":"packs"})");
    EXPECT_EQ(reqOf(TypeParam(nullptr)), R"({"db_host":"","db_name":""})");
}

TYPED_TEST(CmdNamingADatabase, ReadsBothKeys) {
    TypeParam cmd(nullptr);
    readReq(cmd, R"({"db_host":"db","db_name":"packs"})");
    EXPECT_EQ(cmd.dbHost(), "db");
    EXPECT_EQ(cmd.dbName(), "packs");
}

TYPED_TEST(CmdNamingADatabase, ReadsStrictlyAndInOrder) {
    TypeParam cmd(nullptr, "old", "old");
    EXPECT_EQ(jsonError([&] { readReq(cmd, R"({"db_name":"packs"})"); }), NO_STRING);
    EXPECT_EQ(cmd.dbName(), "old");
    EXPECT_EQ(jsonError([&] { readReq(cmd, R"({"db_host":"db"})"); }), NO_STRING);
    EXPECT_EQ(cmd.dbHost(), "db");
    EXPECT_EQ(cmd.dbName(), "old");
}

TEST(UploadQueued, SerialisesAsUpdateStatusDoes) {
    EXPECT_EQ(reqOf(Ipc::UploadQueued(nullptr, "db", "packs")),
              reqOf(Ipc::UpdateStatus(nullptr, "db", "packs")));
}

// --- GuiFwd

TEST(GuiFwd, KeepsItsObjectAtHome) {
    Ipc::GuiFwd cmd(nullptr, {{"host", "h"}});
    EXPECT_EQ(text(cmd.params()), R"({"host":"h"})");
    EXPECT_EQ(reqOf(cmd), "{}");
    EXPECT_EQ(respOf(cmd), "{}");
    readReq(cmd, R"({"x":1})");
    readResp(cmd, R"({"x":1})");
    EXPECT_EQ(text(cmd.params()), R"({"host":"h"})");
}

TEST(GuiFwd, IsEmptyAtFirst) { EXPECT_EQ(text(Ipc::GuiFwd(nullptr).params()), "{}"); }

} // namespace
