#pragma once

/// The tables of the account store, as the steps that made them. A step that has been released never changes; a new one is put
/// behind it.

#include <array>
#include <cstdint>
#include <string_view>

namespace palisade {

/// "PlAc" in ASCII.
inline constexpr std::int32_t accountStoreApplicationID = 0x506c4163;

/// `position` and `id` count up and give the store's order; a row of the history moves to the end when it repeats. Options and
/// permissions are JSON; NULL is none. `digest` tells a damaged record from a good one.
inline constexpr std::array<std::string_view, 4> accountStoreMigrations{R"sql(
  CREATE TABLE accounts (
    position INTEGER PRIMARY KEY,
    id TEXT NOT NULL UNIQUE DEFAULT (lower(hex(randomblob(16)))),
    account_type TEXT NOT NULL,
    username TEXT NOT NULL,
    description TEXT NOT NULL,
    UNIQUE (account_type, username)
  ) STRICT;

  CREATE TABLE authorizations (
    position INTEGER PRIMARY KEY,
    account_type TEXT NOT NULL,
    client_id TEXT NOT NULL,
    bundle_id TEXT,
    app_name TEXT NOT NULL,
    granted INTEGER NOT NULL CHECK (granted IN (0, 1)),
    answered_by_nobody INTEGER NOT NULL CHECK (answered_by_nobody IN (0, 1)),
    options TEXT,
    permissions TEXT,
    updated_at INTEGER NOT NULL,
    digest INTEGER NOT NULL,
    UNIQUE (account_type, client_id),
    CHECK (NOT (granted AND answered_by_nobody))
  ) STRICT;
  CREATE INDEX authorizations_answered_by_nobody ON authorizations (client_id) WHERE answered_by_nobody = 1;

  CREATE TABLE history (
    position INTEGER PRIMARY KEY,
    at INTEGER NOT NULL,
    account_type TEXT NOT NULL,
    bundle_id TEXT,
    granted INTEGER NOT NULL,
    user_prompted INTEGER NOT NULL,
    elapsed_seconds REAL NOT NULL
  ) STRICT;
  CREATE INDEX history_of_client ON history (bundle_id, position);
)sql",
                                                                        R"sql(
  CREATE TABLE intents (
    account_type TEXT NOT NULL,
    client_id TEXT NOT NULL,
    kind TEXT NOT NULL CHECK (kind IN ('grant', 'revocation', 'removal')),
    app_id TEXT,
    PRIMARY KEY (account_type, client_id)
  ) STRICT, WITHOUT ROWID;
)sql",
                                                                        R"sql(
  CREATE INDEX authorizations_of_bundle ON authorizations (bundle_id);
)sql",
                                                                        R"sql(
  DROP TABLE history;
  CREATE TABLE history (
    position INTEGER PRIMARY KEY,
    first_at INTEGER NOT NULL,
    last_at INTEGER NOT NULL,
    count INTEGER NOT NULL CHECK (count > 0),
    account_type TEXT NOT NULL,
    bundle_id TEXT,
    granted INTEGER NOT NULL CHECK (granted IN (0, 1)),
    user_prompted INTEGER NOT NULL CHECK (user_prompted IN (0, 1)),
    elapsed_seconds REAL NOT NULL
  ) STRICT;
  CREATE INDEX history_of_client ON history (bundle_id, position);
)sql"};

}  // namespace palisade
