-- A database of version 2, as programs of that time left it. It is never edited: what has once been
-- written has to be read for ever. How it is restored and compared: tests/db/golden_test.cpp.
PRAGMA foreign_keys = OFF;
BEGIN;

CREATE TABLE entry (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  hash TEXT UNIQUE,
  project_name TEXT,
  enabled INTEGER,
  owner_uid INTEGER,
  start_at INTEGER,
  expire_at INTEGER,
  expire_times INTEGER,
  use_count INTEGER,
  auto_gc INTEGER,
  data TEXT
);

CREATE TABLE session (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  session_id TEXT UNIQUE,
  uid INTEGER,
  ip TEXT,
  timeout INTEGER
);

CREATE TABLE token (
  id INTEGER PRIMARY KEY AUTOINCREMENT,
  entry_id INTEGER REFERENCES entry (id) ON DELETE CASCADE,
  session_id INTEGER REFERENCES session (id) ON DELETE CASCADE,
  timeout INTEGER
);

CREATE INDEX entry_by_owner ON entry (owner_uid);
CREATE INDEX entry_by_project ON entry (project_name);
CREATE INDEX entry_by_owner_project ON entry (owner_uid, project_name);

CREATE INDEX entry_past_time ON entry (auto_gc, expire_at)
  WHERE expire_at != 0;
CREATE INDEX entry_used_up ON entry (auto_gc)
  WHERE expire_times != 0 AND use_count >= expire_times;

CREATE INDEX session_by_timeout ON session (timeout);
CREATE INDEX token_by_timeout ON token (timeout);

CREATE INDEX token_by_session_entry ON token (session_id, entry_id);

CREATE INDEX token_by_entry ON token (entry_id);

PRAGMA user_version = 2;

-- Links as the library writes them: 1 to 14, and 1000000007.
-- open to all
INSERT INTO entry VALUES (1, 'Zk3AbcDe9', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- for a password (correct horse), salted SHA-1
INSERT INTO entry VALUES (2, 'pAssw0rd1', 'photo', 1, 2001, 0, 0, 0, 7, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"84178d9a0b3d9bd9848bde7152edfc54b5c6663f","protect_password_algo":"default","protect_password_salt":"Zk3w9Q","protect_title":"Holiday","protect_type":"password","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- for a password (battery staple), MD5
INSERT INTO entry VALUES (3, 'pAssw0rd2', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":false,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"642b22482681a9d3460924f67bb0c9d6","protect_password_algo":"md5","protect_password_salt":"","protect_title":"","protect_type":"password","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- for accounts: ids, an id that is gone, and names that nobody has
INSERT INTO entry VALUES (4, 'useRs0001', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":["choir"],"protect_extra_users":["zoe"],"protect_gids":[3001],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"user","protect_uids":[2001,4294967294],"redirect_type":"none","redirect_uri":""}');
-- sent on always
INSERT INTO entry VALUES (5, 'reDirect1', 'drive', 1, 2002, 0, 0, 0, 0, 0,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"always","redirect_uri":"https://nas.example.org/a?b=c&d#e"}');
-- sent on if asked
INSERT INTO entry VALUES (6, 'reDirect2', 'drive', 1, 2002, 0, 0, 0, 0, 0,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"url_param","redirect_uri":"/drive/"}');
-- switched off; a file
INSERT INTO entry VALUES (7, 'switchOff', 'file', 0, 2002, 0, 0, 0, 0, 1,
  '{"app":{"path":"/srv/shares/report.pdf"},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- not begun
INSERT INTO entry VALUES (8, 'tooEarly1', 'file', 1, 2002, 2147483647, 0, 0, 0, 1,
  '{"app":{"path":"/srv/shares/report.pdf"},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- past its end, kept for the purge
INSERT INTO entry VALUES (9, 'tooLate01', 'file', 1, 2002, 1000000000, 1000000001, 0, 0, 1,
  '{"app":{"path":"/srv/shares/report.pdf"},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- used up
INSERT INTO entry VALUES (10, 'usedUp003', 'file', 1, 2002, 0, 0, 3, 3, 0,
  '{"app":{"path":"/srv/shares/report.pdf"},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- the greatest numbers that every width holds
INSERT INTO entry VALUES (11, 'greatest1', 'photo', 1, 4294967294, 2147483647, 2147483647, 2147483647, 2147483647, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- texts that are hard to quote; a hash of digits alone; data of every JSON type
INSERT INTO entry VALUES (12, '000000042', 'O''Reilly "&" <b>; DROP TABLE entry; -- ü 日本 😀
second line\', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{"":"empty name","list":[null,true,-1,2.5,"x",{"y":[]}]},"enable_match_ip":true,"private_data":{"key":"Gehe1m''\""},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"line\nbreak\ttab \\ \" '' % _ ; -- ü 日本 😀 \u0001\u0000","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- the hash of 1 in other case; root's; for names alone, one twice
INSERT INTO entry VALUES (13, 'zK3aBCdE9', 'photo', 1, 0, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":["zoe","zoe"],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"user","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- a long document
INSERT INTO entry VALUES (14, 'longData1', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  replace('{"app":{"text":"@"},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}', '@', printf('%.*c', 100000, 'x')));
-- a great row number
INSERT INTO entry VALUES (1000000007, 'bigNumber', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');

-- Links as other programs may have written them, or as a program left them that wrote SQL of its own.
-- Those that load:
-- no more than is needed, and a member that nobody knows
INSERT INTO entry VALUES (21, 'onlyNeeds', 'photo', NULL, 2001, NULL, NULL, NULL, NULL, NULL,
  '{"app":{},"protect_type":"none","protect_password_algo":"default","redirect_type":"none","later":[1,{"a":null}]}');
-- members that are null or of another type, blanks between them
INSERT INTO entry VALUES (22, 'nullParts', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  ' { "app" : { } , "protect_type" : "none", "protect_uids" : null, "protect_title" : 7, "redirect_uri" : null,
  "enable_match_ip" : 1, "protect_password_algo" : null, "redirect_type" : null } ');
-- texts and a fraction in columns for numbers
INSERT INTO entry VALUES (23, 'textAsNum', 'photo', 'yes', 2001, 'soon', '12 o''clock', '3 times', 1.5, 'x',
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- numbers below zero, and others than 0 and 1
INSERT INTO entry VALUES (24, 'negatives', 'photo', 2, 2001, -1, -1, -5, -2147483648, 7,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- numbers that an int cannot hold, and times that 32 bits cannot
INSERT INTO entry VALUES (25, 'tooGreat1', 'photo', 1, 2001, 4102444800, 4102444801, 9223372036854775807, 2147483648, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- bytes that are no UTF-8, a zero byte, a document that is a blob
INSERT INTO entry VALUES (26, CAST(X'c328ff27' AS TEXT), CAST(X'61006200' AS TEXT), 1, 2001, 0, 0, 0, 0, 1,
  CAST('{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}' AS BLOB));

-- Those that do not load:
-- nothing
INSERT INTO entry VALUES (31, NULL, NULL, NULL, NULL, NULL, NULL, NULL, NULL, NULL,
  NULL);
-- no hash
INSERT INTO entry VALUES (32, NULL, 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- an empty hash
INSERT INTO entry VALUES (33, '', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- no project
INSERT INTO entry VALUES (34, 'noProject', '', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- no owner
INSERT INTO entry VALUES (35, 'noOwner01', 'photo', 1, 4294967295, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- an owner that is no uid
INSERT INTO entry VALUES (36, 'ownerOver', 'photo', 1, 4294967296, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"none","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- no document
INSERT INTO entry VALUES (37, 'noData001', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  NULL);
-- a document that breaks off
INSERT INTO entry VALUES (38, 'noJson001', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{}');
-- a document that is a list
INSERT INTO entry VALUES (39, 'noObject1', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '[1,2,3]');
-- a document without members
INSERT INTO entry VALUES (40, 'noMember1', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{}');
-- for a password that was never set
INSERT INTO entry VALUES (41, 'noPasswd1', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"password","protect_uids":[],"redirect_type":"none","redirect_uri":""}');
-- an account that is none
INSERT INTO entry VALUES (42, 'rootsOwn1', 'photo', 1, 2001, 0, 0, 0, 0, 1,
  '{"app":{},"enable_match_ip":true,"private_data":{},"protect_extra_groups":[],"protect_extra_users":[],"protect_gids":[],"protect_password":"","protect_password_algo":"default","protect_password_salt":"","protect_title":"","protect_type":"user","protect_uids":[null],"redirect_type":"none","redirect_uri":""}');

-- Sessions: 1 to 3, 6 and 2147483646 as the library writes them.
-- of an account
INSERT INTO session VALUES (1, 'aB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL', 2001, '192.0.2.1', 2147483647);
-- of nobody
INSERT INTO session VALUES (2, 'bB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL', 4294967295, '2001:db8::1', 2147483647);
-- expired
INSERT INTO session VALUES (3, 'cB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL', 2002, '192.0.2.3', 1000000000);
-- nothing
INSERT INTO session VALUES (4, NULL, NULL, NULL, NULL);
-- empty texts
INSERT INTO session VALUES (5, '', 0, '', 2147483647);
-- digits alone, zeros first
INSERT INTO session VALUES (6, '00000000000000000000000000000042', 0, '192.0.2.6', 2147483647);
-- texts for numbers
INSERT INTO session VALUES (7, 'dB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL', 'alice', '192.0.2.7', 'never');
-- a time that 32 bits cannot hold
INSERT INTO session VALUES (8, 'eB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL', 2001, '192.0.2.8', 4102444800);
-- no account told; an odd identifier
INSERT INTO session VALUES (9, 'it''s "odd" ü', NULL, 'somewhere', 2147483647);
-- a great row number
INSERT INTO session VALUES (2147483646, 'fB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL', 2001, '192.0.2.9', 2147483647);

-- Tokens: 1 to 6 and 2147483647 as the library writes them.
-- link 1, session 1
INSERT INTO token VALUES (1, 1, 1, 2147483647);
-- the same pair once more
INSERT INTO token VALUES (2, 1, 1, 2147483647);
-- link 2, session 2
INSERT INTO token VALUES (3, 2, 2, 2147483647);
-- expired
INSERT INTO token VALUES (4, 3, 1, 1000000000);
-- of a session that has expired
INSERT INTO token VALUES (5, 1, 3, 2147483647);
-- great row numbers
INSERT INTO token VALUES (6, 1000000007, 2147483646, 2147483647);
-- nothing
INSERT INTO token VALUES (7, NULL, NULL, NULL);
-- no link
INSERT INTO token VALUES (8, NULL, 1, 2147483647);
-- link and session gone: deleted by a program without foreign keys
INSERT INTO token VALUES (9, 99, 98, 2147483647);
-- a text for a time
INSERT INTO token VALUES (10, 2, 1, 'never');
-- a great row number
INSERT INTO token VALUES (2147483647, 5, 2, 2147483647);

-- More rows were there once: no number is given out again.
UPDATE sqlite_sequence SET seq = 1000000100 WHERE name = 'entry';

COMMIT;
