#pragma once

#include <array>
#include <string_view>

namespace deviceimage {

// "QIRD" in the header of each database, so that `file` and other programs can tell what it is.
inline constexpr int kApplicationId = 0x51495244;
inline constexpr int kSchemaVersion = 1;

// The same in all databases; docs/device-image.md explains each column. No statement is ever
// changed: a new version adds to the list and raises kSchemaVersion.
inline constexpr std::array<std::string_view, 11> kSchema = {
    R"(CREATE TABLE stores (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  account TEXT CHECK (account <> ''),
  retired_at INTEGER,
  visible INTEGER NOT NULL DEFAULT 1 CHECK (visible IN (0, 1)),
  reminders_visible INTEGER NOT NULL DEFAULT 1 CHECK (reminders_visible IN (0, 1))
) STRICT)",
    R"(CREATE UNIQUE INDEX active_stores ON stores (ifnull(account, '')) WHERE retired_at IS NULL)",
    R"(CREATE TABLE collections (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  store INTEGER NOT NULL REFERENCES stores (id),
  kind TEXT NOT NULL CHECK (kind IN ('mailaccount', 'contact', 'event', 'todo', 'bookmark', 'note')),
  parent INTEGER,
  name TEXT NOT NULL,
  writable INTEGER NOT NULL DEFAULT 1 CHECK (writable IN (0, 1)),
  is_default INTEGER NOT NULL DEFAULT 0 CHECK (is_default IN (0, 1)),
  UNIQUE (id, store, kind),
  FOREIGN KEY (parent, store, kind) REFERENCES collections (id, store, kind)
) STRICT)",
    R"(CREATE UNIQUE INDEX collection_names ON collections (store, kind, ifnull(parent, 0), name))",
    R"(CREATE UNIQUE INDEX default_collections ON collections (store, kind) WHERE is_default)",
    R"(CREATE INDEX collection_parents ON collections (parent, store, kind))",
    R"(CREATE TABLE records (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  store INTEGER NOT NULL,
  kind TEXT NOT NULL,
  collection INTEGER NOT NULL,
  uid TEXT NOT NULL CHECK (uid <> ''),
  base_uid TEXT NOT NULL CHECK (base_uid <> ''),
  content BLOB NOT NULL,
  content_hash TEXT NOT NULL CHECK (length(content_hash) = 64),
  modified_at INTEGER NOT NULL,
  source_account TEXT,
  source_uid TEXT CHECK ((source_account IS NULL) = (source_uid IS NULL)),
  UNIQUE (store, kind, uid),
  UNIQUE (store, kind, base_uid, content_hash),
  FOREIGN KEY (collection, store, kind) REFERENCES collections (id, store, kind)
) STRICT)",
    R"(CREATE UNIQUE INDEX record_sources ON records (store, kind, source_account, source_uid)
  WHERE source_uid IS NOT NULL)",
    R"(CREATE INDEX record_collections ON records (collection, store, kind))",
    R"(CREATE TABLE anchors (
  store INTEGER NOT NULL REFERENCES stores (id),
  kind TEXT NOT NULL,
  anchor TEXT NOT NULL,
  PRIMARY KEY (store, kind)
) STRICT, WITHOUT ROWID)",
    R"(CREATE TABLE settings (
  name TEXT PRIMARY KEY,
  value TEXT NOT NULL
) STRICT, WITHOUT ROWID)"};

}  // namespace deviceimage
