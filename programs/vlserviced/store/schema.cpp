#include "programs/vlserviced/store/schema.h"

#include "programs/database/postgres_connection.h"
#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/store/pack_store.h"

namespace VlServiced {
namespace {

/// "VLSD" as a number.
constexpr int APPLICATION_ID = 0x564C5344;

/// Settings are a tree of nodes under the root, whose id is the empty text; a node's parts hold its own
/// values alone. Service settings are one object. A job's states are those of Protocol::JobState.
constexpr char const* SCHEMA_1 = R"sql(
CREATE TABLE nodes (
    id     TEXT NOT NULL PRIMARY KEY,
    parent TEXT REFERENCES nodes (id),
    CHECK ((id = '') = (parent IS NULL))
) WITHOUT ROWID;
CREATE INDEX nodes_by_parent ON nodes (parent);
INSERT INTO nodes VALUES ('', NULL);

CREATE TABLE parts (
    node TEXT NOT NULL REFERENCES nodes (id) ON DELETE CASCADE,
    part TEXT NOT NULL,
    json TEXT NOT NULL,
    PRIMARY KEY (node, part)
) WITHOUT ROWID;

CREATE TABLE service_settings (
    one  INTEGER NOT NULL PRIMARY KEY CHECK (one = 1),
    json TEXT NOT NULL
);

CREATE TABLE jobs (
    pack          TEXT NOT NULL PRIMARY KEY,
    db_folder     TEXT NOT NULL,
    db_name       TEXT NOT NULL,
    cfg_id        TEXT NOT NULL,
    title         TEXT NOT NULL,
    documents     INTEGER NOT NULL,
    pages         INTEGER NOT NULL,
    state         TEXT NOT NULL,
    problem       TEXT NOT NULL DEFAULT '',
    to_upload     INTEGER NOT NULL DEFAULT 0,
    upload_folder TEXT NOT NULL DEFAULT '',
    accepted_at   INTEGER NOT NULL,
    changed_at    INTEGER NOT NULL
) WITHOUT ROWID;
CREATE INDEX jobs_by_state ON jobs (state);
)sql";

/// Each index ends in what the jobs are ordered by.
constexpr char const* SCHEMA_2 = R"sql(
DROP INDEX jobs_by_state;
CREATE INDEX jobs_by_state ON jobs (state, accepted_at, pack);
CREATE INDEX jobs_by_acceptance ON jobs (accepted_at, pack);
CREATE INDEX jobs_by_database ON jobs (db_folder, db_name, accepted_at, pack);
)sql";

/// An empty identity is one from a service that kept none.
constexpr char const* SCHEMA_3 = R"sql(
ALTER TABLE jobs ADD COLUMN upload_identity TEXT NOT NULL DEFAULT '';
)sql";

/// A job is due at an instant, or never by itself. The index holds those that wait for it and no others.
constexpr char const* SCHEMA_4 = R"sql(
ALTER TABLE jobs ADD COLUMN due INTEGER;
ALTER TABLE jobs ADD COLUMN to_hold INTEGER NOT NULL DEFAULT 0;
ALTER TABLE jobs ADD COLUMN trial INTEGER NOT NULL DEFAULT 0;
CREATE INDEX jobs_by_due ON jobs (due, pack) WHERE state = 'held' AND due IS NOT NULL;
)sql";

/// A document is a name at a node and a content, which is kept once however many there are of it, in pieces,
/// and goes with the last of them. One without a digest is still on its way.
constexpr char const* SCHEMA_5 = R"sql(
CREATE TABLE document_contents (
    number INTEGER NOT NULL PRIMARY KEY,
    sha256 TEXT UNIQUE,
    bytes  INTEGER NOT NULL
);
CREATE TABLE document_pieces (
    content INTEGER NOT NULL REFERENCES document_contents (number) ON DELETE CASCADE,
    place   INTEGER NOT NULL,
    data    BLOB NOT NULL,
    PRIMARY KEY (content, place)
);
CREATE TABLE documents (
    node    TEXT NOT NULL REFERENCES nodes (id) ON DELETE CASCADE,
    name    TEXT NOT NULL,
    content INTEGER NOT NULL REFERENCES document_contents (number),
    put_at  INTEGER NOT NULL,
    PRIMARY KEY (node, name)
) WITHOUT ROWID;
CREATE INDEX documents_by_content ON documents (content);
)sql";

constexpr char const* SQLITE_5 = R"sql(
CREATE TRIGGER document_removed AFTER DELETE ON documents
WHEN NOT EXISTS (SELECT 1 FROM documents WHERE content = old.content) BEGIN
    DELETE FROM document_contents WHERE number = old.content;
END;
CREATE TRIGGER document_replaced AFTER UPDATE OF content ON documents
WHEN NOT EXISTS (SELECT 1 FROM documents WHERE content = old.content) BEGIN
    DELETE FROM document_contents WHERE number = old.content;
END;
)sql";

constexpr char const* POSTGRES_5 = R"sql(
CREATE FUNCTION drop_document_content() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    IF NOT EXISTS (SELECT 1 FROM documents WHERE content = old.content) THEN
        DELETE FROM document_contents WHERE number = old.content;
    END IF;
    RETURN NULL;
END $$;
CREATE TRIGGER document_removed AFTER DELETE ON documents
FOR EACH ROW EXECUTE FUNCTION drop_document_content();
CREATE TRIGGER document_replaced AFTER UPDATE OF content ON documents
FOR EACH ROW WHEN (old.content <> new.content) EXECUTE FUNCTION drop_document_content();
)sql";

/// Letters in the order in which they were divided among the channels. Those of channels without a carrier
/// stand for themselves in the container, and bear its state. `letters_state` is that of the others, where a
/// job has both.
constexpr char const* SCHEMA_6 = R"sql(
CREATE TABLE letters (
    id         INTEGER NOT NULL PRIMARY KEY,
    pack       TEXT NOT NULL REFERENCES jobs (pack) ON DELETE CASCADE,
    number     INTEGER NOT NULL,
    channel    TEXT NOT NULL,
    by_carrier INTEGER NOT NULL,
    state      TEXT NOT NULL,
    says       TEXT NOT NULL DEFAULT '',
    changed_at INTEGER NOT NULL,
    attempts   INTEGER NOT NULL DEFAULT 0,
    first_try  INTEGER NOT NULL DEFAULT 0,
    due        INTEGER NOT NULL DEFAULT 0,
    UNIQUE (pack, number)
);
CREATE INDEX letters_to_go ON letters (channel, due, id) WHERE state = 'waiting' AND by_carrier = 1;
CREATE INDEX letters_in_doubt ON letters (channel) WHERE state IN ('handed over', 'uncertain');
CREATE INDEX letters_by_state ON letters (pack, state, number) WHERE by_carrier = 1;

CREATE TABLE carriers (
    channel  TEXT NOT NULL PRIMARY KEY,
    paused   INTEGER NOT NULL,
    failures INTEGER NOT NULL,
    says     TEXT NOT NULL,
    since    INTEGER NOT NULL,
    try_at   INTEGER NOT NULL
) WITHOUT ROWID;

ALTER TABLE jobs ADD COLUMN divided INTEGER NOT NULL DEFAULT 0;
ALTER TABLE jobs ADD COLUMN letters_state TEXT NOT NULL DEFAULT '';
ALTER TABLE jobs ADD COLUMN letters_problem TEXT NOT NULL DEFAULT '';
CREATE INDEX jobs_with_letters ON jobs (pack) WHERE letters_state = 'delivering';
)sql";

/// Of a token the database has what checks it. One that was revoked stays, so that its holder is told; its
/// name is free.
constexpr char const* SCHEMA_7 = R"sql(
CREATE TABLE tokens (
    id            TEXT NOT NULL PRIMARY KEY,
    name          TEXT NOT NULL,
    role          TEXT NOT NULL,
    node          TEXT NOT NULL,
    service_key   TEXT NOT NULL,
    client_digest TEXT NOT NULL,
    added_at      INTEGER NOT NULL,
    added_by      TEXT NOT NULL,
    revoked_at    INTEGER NOT NULL
) WITHOUT ROWID;
CREATE UNIQUE INDEX tokens_by_name ON tokens (name) WHERE revoked_at = 0;
)sql";

/// What people have changed, in the order in which they did.
constexpr char const* SCHEMA_8 = R"sql(
CREATE TABLE history (
    number INTEGER NOT NULL PRIMARY KEY,
    at     INTEGER NOT NULL,
    who    TEXT NOT NULL,
    node   TEXT NOT NULL,
    what   TEXT NOT NULL,
    was    TEXT NOT NULL,
    is_now TEXT NOT NULL
);
CREATE INDEX history_by_time ON history (at);
)sql";

/// Who works on a job holds it until `try_at`, in milliseconds by the database's clock; when nobody does, it
/// says when somebody may try. The fence grows each time that somebody takes hold. `submit_fence` is the one
/// under which its container was staged.
constexpr char const* SCHEMA_9 = R"sql(
ALTER TABLE jobs ADD COLUMN holder TEXT NOT NULL DEFAULT '';
ALTER TABLE jobs ADD COLUMN fence INTEGER NOT NULL DEFAULT 0;
ALTER TABLE jobs ADD COLUMN try_at INTEGER NOT NULL DEFAULT 0;
ALTER TABLE jobs ADD COLUMN submit_fence INTEGER NOT NULL DEFAULT 0;
CREATE INDEX jobs_to_claim ON jobs (try_at, pack)
WHERE (state IN ('accepted', 'submitting') OR (state = 'queued' AND to_upload = 1));

ALTER TABLE carriers ADD COLUMN holder TEXT NOT NULL DEFAULT '';
ALTER TABLE carriers ADD COLUMN fence INTEGER NOT NULL DEFAULT 0;
ALTER TABLE carriers ADD COLUMN held_until INTEGER NOT NULL DEFAULT 0;
)sql";

/// What changes is told to all services in the transaction that changes it.
constexpr char const* POSTGRES_9 = R"sql(
CREATE FUNCTION clock_ms() RETURNS BIGINT LANGUAGE sql STABLE AS
    'SELECT CAST(floor(extract(epoch FROM clock_timestamp()) * 1000) AS BIGINT)';

CREATE FUNCTION tell_of_job() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    PERFORM pg_notify('vlserviced_jobs', new.pack);
    IF new.holder = '' AND
       (new.state IN ('accepted', 'submitting') OR (new.state = 'queued' AND new.to_upload = 1)) THEN
        PERFORM pg_notify('vlserviced_work', '');
    END IF;
    RETURN NULL;
END $$;
CREATE TRIGGER job_added AFTER INSERT ON jobs FOR EACH ROW EXECUTE FUNCTION tell_of_job();
CREATE TRIGGER job_changed AFTER UPDATE OF state, problem, to_upload, letters_state ON jobs
FOR EACH ROW EXECUTE FUNCTION tell_of_job();

CREATE FUNCTION tell_of_letters() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    PERFORM pg_notify('vlserviced_letters', '');
    RETURN NULL;
END $$;
CREATE TRIGGER letters_added AFTER INSERT ON letters
FOR EACH STATEMENT EXECUTE FUNCTION tell_of_letters();

CREATE FUNCTION tell_of_settings() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    PERFORM pg_notify('vlserviced_settings', '');
    RETURN NULL;
END $$;
CREATE TRIGGER nodes_changed AFTER INSERT OR DELETE ON nodes
FOR EACH STATEMENT EXECUTE FUNCTION tell_of_settings();
CREATE TRIGGER parts_changed AFTER INSERT OR UPDATE OR DELETE ON parts
FOR EACH STATEMENT EXECUTE FUNCTION tell_of_settings();
CREATE TRIGGER service_settings_changed AFTER INSERT OR UPDATE ON service_settings
FOR EACH STATEMENT EXECUTE FUNCTION tell_of_settings();
)sql";

/// E-mails that tell of a mailing or of one of its letters go on their way as letters do, under numbers below
/// 0: `notice_of` is the letter, or 0. Until that is handed over they are held.
constexpr char const* SCHEMA_10 = R"sql(
ALTER TABLE letters ADD COLUMN notice_of INTEGER NOT NULL DEFAULT 0;
ALTER TABLE letters ADD COLUMN recipient TEXT NOT NULL DEFAULT '';
ALTER TABLE letters ADD COLUMN reply_to TEXT NOT NULL DEFAULT '';
ALTER TABLE letters ADD COLUMN reference TEXT NOT NULL DEFAULT '';
CREATE INDEX notices_held ON letters (pack, notice_of) WHERE state = 'held';
)sql";

/// Another service may have their carrier.
constexpr char const* POSTGRES_10 = R"sql(
CREATE TRIGGER notice_released AFTER UPDATE OF state ON letters
FOR EACH ROW WHEN (old.state = 'held' AND new.state = 'waiting') EXECUTE FUNCTION tell_of_letters();
)sql";

/// Channels that a letter may go by yet when the one that it goes by fails, and those that have failed;
/// separated by blanks. One that it has no address of has "-" in front.
constexpr char const* SCHEMA_11 = R"sql(
ALTER TABLE letters ADD COLUMN other_ways TEXT NOT NULL DEFAULT '';
ALTER TABLE letters ADD COLUMN tried TEXT NOT NULL DEFAULT '';
)sql";

/// Another service may have the carrier of the other channel.
constexpr char const* POSTGRES_11 = R"sql(
CREATE TRIGGER letter_fell_back AFTER UPDATE OF channel ON letters
FOR EACH STATEMENT EXECUTE FUNCTION tell_of_letters();
)sql";

/// Letters that were accepted, each under a key that tells nothing of it, until somebody may send the same
/// one again. `number` is that of what it goes out in; a key that is free belongs to a letter that went
/// nowhere. Triggers keep that in step with jobs and letters, whoever changes them.
/// The turn of a letter is 0, or the id of a mailing that it was sent again in: each frees its own, and it
/// may go out once more when none of them has it.
constexpr char const* SCHEMA_12 = R"sql(
CREATE TABLE register_secret (
    one    INTEGER NOT NULL PRIMARY KEY CHECK (one = 1),
    secret TEXT NOT NULL
);
CREATE TABLE registered_mailings (
    id      INTEGER NOT NULL PRIMARY KEY,
    pack    TEXT NOT NULL UNIQUE,
    node    TEXT NOT NULL,
    at      INTEGER NOT NULL,
    ends_at INTEGER NOT NULL
);
CREATE INDEX registered_mailings_by_end ON registered_mailings (ends_at);
CREATE TABLE registered_letters (
    letter  TEXT NOT NULL,
    turn    INTEGER NOT NULL,
    mailing INTEGER NOT NULL,
    number  INTEGER NOT NULL,
    ends_at INTEGER NOT NULL,
    is_free INTEGER NOT NULL,
    PRIMARY KEY (letter, turn)
) WITHOUT ROWID;
CREATE INDEX registered_letters_by_mailing ON registered_letters (mailing, number);
CREATE INDEX letters_sent_again ON registered_letters (letter) WHERE turn > 0;
)sql";

constexpr char const* SQLITE_12 = R"sql(
CREATE TRIGGER job_freed AFTER UPDATE OF state ON jobs
WHEN (old.state IN ('failed', 'cancelled')) <> (new.state IN ('failed', 'cancelled')) BEGIN
    UPDATE registered_letters SET is_free = CASE WHEN new.state IN ('failed', 'cancelled') THEN 1 ELSE 0 END
    WHERE mailing = (SELECT id FROM registered_mailings WHERE pack = new.pack) AND
          (new.divided = 0 OR
           number IN (SELECT number FROM letters WHERE pack = new.pack AND by_carrier = 0));
END;
CREATE TRIGGER letter_freed AFTER UPDATE OF state ON letters
WHEN new.number > 0 AND (old.state = 'failed') <> (new.state = 'failed') BEGIN
    UPDATE registered_letters SET is_free = CASE WHEN new.state = 'failed' THEN 1 ELSE 0 END
    WHERE mailing = (SELECT id FROM registered_mailings WHERE pack = new.pack) AND number = new.number;
END;
)sql";

constexpr char const* POSTGRES_12 = R"sql(
CREATE FUNCTION free_letters_of_job() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    UPDATE registered_letters SET is_free = CASE WHEN new.state IN ('failed', 'cancelled') THEN 1 ELSE 0 END
    WHERE mailing = (SELECT id FROM registered_mailings WHERE pack = new.pack) AND
          (new.divided = 0 OR
           number IN (SELECT number FROM letters WHERE pack = new.pack AND by_carrier = 0));
    RETURN NULL;
END $$;
CREATE TRIGGER job_freed AFTER UPDATE OF state ON jobs FOR EACH ROW
WHEN ((old.state IN ('failed', 'cancelled')) <> (new.state IN ('failed', 'cancelled')))
EXECUTE FUNCTION free_letters_of_job();

CREATE FUNCTION free_letter() RETURNS trigger LANGUAGE plpgsql AS $$
BEGIN
    UPDATE registered_letters SET is_free = CASE WHEN new.state = 'failed' THEN 1 ELSE 0 END
    WHERE mailing = (SELECT id FROM registered_mailings WHERE pack = new.pack) AND number = new.number;
    RETURN NULL;
END $$;
CREATE TRIGGER letter_freed AFTER UPDATE OF state ON letters FOR EACH ROW
WHEN (new.number > 0 AND (old.state = 'failed') <> (new.state = 'failed'))
EXECUTE FUNCTION free_letter();
)sql";

/// When something was added to a content that is on its way, in milliseconds by the database's clock.
constexpr char const* SCHEMA_13 = R"sql(
ALTER TABLE document_contents ADD COLUMN touched_at INTEGER NOT NULL DEFAULT 0;
)sql";

/// In KiB: all but the leaves of an index of 10 million letters stay at hand. What is not used takes nothing.
constexpr char const* BEGINNING = "PRAGMA cache_size = -32768";

} // namespace

Database::DatabaseKind const& serviceDatabase() {
    static Database::DatabaseKind const kind{"service database",
                                             APPLICATION_ID,
                                             {SCHEMA_1,
                                              SCHEMA_2,
                                              SCHEMA_3,
                                              SCHEMA_4,
                                              {SCHEMA_5, SQLITE_5, POSTGRES_5},
                                              SCHEMA_6,
                                              SCHEMA_7,
                                              SCHEMA_8,
                                              {SCHEMA_9, "", POSTGRES_9},
                                              {SCHEMA_10, "", POSTGRES_10},
                                              {SCHEMA_11, "", POSTGRES_11},
                                              {SCHEMA_12, SQLITE_12, POSTGRES_12},
                                              SCHEMA_13},
                                             BEGINNING};
    return kind;
}

std::unique_ptr<Database::Connection> openServiceDatabase(std::filesystem::path const& file) {
    SQLite::Database database =
        Database::openDatabase(file, serviceDatabase(), Database::Journal::WriteAhead);
    Database::requireUndamaged(database, serviceDatabase());
    return std::make_unique<Database::SqliteConnection>(std::move(database));
}

std::unique_ptr<Database::Connection> openToLook(std::filesystem::path const& file) {
    constexpr int PATIENCE_MS = 5000;
    return std::make_unique<Database::SqliteConnection>(
        SQLite::Database(file.string(), SQLite::OPEN_READONLY, PATIENCE_MS));
}

SharedDatabase openSharedDatabase(std::string const& address) {
    Database::requirePostgresAddress(address);
    SharedDatabase shared{std::make_unique<Database::PostgresConnection>(address)};
    shared.isNew = Database::migratePostgres(*shared.connection, serviceDatabase(), address);
    Database::migratePostgres(*shared.connection, packStoreDatabase(), address);
    return shared;
}

} // namespace VlServiced
