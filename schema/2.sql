-- Version 2: the indices, so that no statement of a request reads a whole table. The look-ups by
-- hash and by session identifier are served already, by the indices that UNIQUE made.
--
-- A transaction, IMMEDIATE and IF NOT EXISTS for the reasons given in 1.sql.
BEGIN IMMEDIATE;

-- An owner's links, a project's, and an owner's in a project: listed, purged, deleted. One index for
-- each, since only the index whose columns are all given also yields the rows in the order of their
-- ids, and a listing by page asks for that order. Without it SQLite, once it has statistics, walks
-- the table in that order instead of searching and sorting.
CREATE INDEX IF NOT EXISTS entry_by_owner ON entry (owner_uid);
CREATE INDEX IF NOT EXISTS entry_by_project ON entry (project_name);
CREATE INDEX IF NOT EXISTS entry_by_owner_project ON entry (owner_uid, project_name);

-- The automatic purge deletes the links with auto_gc = 1 that are past their time OR used up. SQLite
-- answers an OR from indices only if each side has one of its own that an equality or range leads
-- into, so there are two, holding just the rows that can ever match. Their conditions must be those
-- of the statement, term by term; auto_gc = 1 must stay out of them, being the column to search by.
CREATE INDEX IF NOT EXISTS entry_past_time ON entry (auto_gc, expire_at)
  WHERE expire_at != 0;
CREATE INDEX IF NOT EXISTS entry_used_up ON entry (auto_gc)
  WHERE expire_times != 0 AND use_count >= expire_times;

-- The purges by time.
CREATE INDEX IF NOT EXISTS session_by_timeout ON session (timeout);
CREATE INDEX IF NOT EXISTS token_by_timeout ON token (timeout);

-- The token of a visitor for a link; its first column serves the removal with a session.
CREATE INDEX IF NOT EXISTS token_by_session_entry ON token (session_id, entry_id);

-- The tokens of a link, purged by themselves or removed with it.
CREATE INDEX IF NOT EXISTS token_by_entry ON token (entry_id);

PRAGMA user_version = 2;

COMMIT;
