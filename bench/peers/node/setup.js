// Makes the database, with one link. Arguments: the build of SQLite, the file, the schema, the link's
// name, its password, the uses that it allows.
'use strict';

const { readFileSync } = require('node:fs');
const { open } = require('./database');
const { digest } = require('./password');

const [sqlite, file, schema, hash, password, uses] = process.argv.slice(2);
const database = open(sqlite, file, false);
database.exec(readFileSync(schema, 'utf8'));
database.prepare('INSERT INTO link (hash, password, uses_allowed) VALUES (?, ?, ?)')
  .run(hash, digest(password), Number(uses));
