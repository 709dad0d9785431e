-- The peers' database: the same job as the library's, laid out as somebody would who writes that job
-- for one application and has no older files to read.
CREATE TABLE link (
  id INTEGER PRIMARY KEY,
  hash TEXT NOT NULL UNIQUE,
  password TEXT NOT NULL,                  -- digest, in the stack's own form
  enabled INTEGER NOT NULL DEFAULT 1,
  start_at INTEGER NOT NULL DEFAULT 0,     -- seconds since the epoch; 0: not set
  expire_at INTEGER NOT NULL DEFAULT 0,    -- seconds since the epoch; 0: not set
  uses_allowed INTEGER NOT NULL DEFAULT 0, -- 0: any number
  uses INTEGER NOT NULL DEFAULT 0
);

CREATE TABLE session (
  sid TEXT PRIMARY KEY,
  data TEXT NOT NULL,                      -- the session handler's
  expires_at INTEGER NOT NULL
) WITHOUT ROWID;
CREATE INDEX session_by_expiry ON session (expires_at);

CREATE TABLE token (
  sid TEXT NOT NULL REFERENCES session (sid) ON DELETE CASCADE,
  link_id INTEGER NOT NULL REFERENCES link (id) ON DELETE CASCADE,
  expires_at INTEGER NOT NULL,
  PRIMARY KEY (sid, link_id)
) WITHOUT ROWID;
CREATE INDEX token_by_link ON token (link_id);
CREATE INDEX token_by_expiry ON token (expires_at);
