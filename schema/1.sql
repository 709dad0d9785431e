-- Version 1: the tables.
--
-- One transaction, which also sets the version: a process that dies in the middle leaves the file
-- as it was. IMMEDIATE, so that processes that meet a new file together queue up here (the
-- connection's busy time-out) instead of failing halfway; IF NOT EXISTS, so that those who come
-- later find the work done and do no harm.
--
-- The columns stand in the order in which the records list their values: rows are inserted without
-- naming columns. Every value arrives as quoted text, and times are even compared with quoted text;
-- INTEGER affinity is what turns both into numbers. Texts are TEXT, so that a hash of digits alone
-- keeps its leading zeros. Columns may be NULL, since other programs' rows may lack values; the
-- records decide what they accept.
--
-- AUTOINCREMENT: an id is never given out twice, so a token or an id that some program still holds
-- cannot come to mean another link or another visitor.
BEGIN IMMEDIATE;

CREATE TABLE IF NOT EXISTS entry (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  hash TEXT UNIQUE,                -- the link's public name; a taken one must make the insert fail
  project_name TEXT,
  enabled INTEGER,                 -- 0 or 1
  owner_uid INTEGER,
  start_at INTEGER,                -- seconds since the epoch; 0: not set
  expire_at INTEGER,               -- seconds since the epoch; 0: not set
  expire_times INTEGER,            -- uses allowed; 0: any number
  use_count INTEGER,
  auto_gc INTEGER,                 -- 0 or 1: may be purged automatically once expired
  data TEXT                        -- the link's other members, a JSON document
);

CREATE TABLE IF NOT EXISTS session (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  session_id TEXT UNIQUE,          -- the visitor's secret; a taken one must make the insert fail
  uid INTEGER,                     -- 4294967295: nobody
  ip TEXT,
  timeout INTEGER                  -- seconds since the epoch
);

-- A token means nothing without its link and its session, and goes with either of them. The pair is
-- not unique: two requests of one visitor may log in at the same moment, and neither shall fail.
CREATE TABLE IF NOT EXISTS token (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  entry_id INTEGER REFERENCES entry (id) ON DELETE CASCADE,
  session_id INTEGER REFERENCES session (id) ON DELETE CASCADE,
  timeout INTEGER                  -- seconds since the epoch
);

PRAGMA user_version = 1;

COMMIT;
