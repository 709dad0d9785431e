// The connection of a process, by one of two builds of SQLite: "native" (better-sqlite3, compiled at
// the installation) or "wasm" (node-sqlite3-wasm). Both are used through the same few calls.
'use strict';

const PRAGMAS = ['synchronous = NORMAL', 'foreign_keys = ON'];

function openNative(file) {
  const database = new (require('better-sqlite3'))(file, { timeout: 10000 });
  for (const pragma of ['journal_mode = WAL', ...PRAGMAS]) database.pragma(pragma);
  return {
    exec: (sql) => database.exec(sql),
    // get(...values): the first row or undefined. run(...values): how many rows it changed.
    prepare(sql) {
      const statement = database.prepare(sql);
      return {
        get: (...values) => statement.get(...values),
        run: (...values) => statement.run(...values).changes,
      };
    },
  };
}

// It has no memory that processes could share, without which SQLite refuses WAL – except to one
// process that has the file to itself. Several get the fastest journal that they can have.
function openWasm(file, alone) {
  const database = new (require('node-sqlite3-wasm').Database)(file);
  const journal = alone
    ? ['locking_mode = EXCLUSIVE', 'journal_mode = WAL']
    : ['busy_timeout = 10000', 'journal_mode = PERSIST'];
  for (const pragma of [...journal, ...PRAGMAS]) database.exec(`PRAGMA ${pragma}`);
  return {
    exec: (sql) => database.exec(sql),
    prepare(sql) {
      const statement = database.prepare(sql);
      return {
        // Not statement.get(), which leaves the statement, and with it the lock, where it is.
        get: (...values) => statement.all(values)[0],
        run: (...values) => statement.run(values).changes,
      };
    },
  };
}

exports.open = (sqlite, file, alone) =>
  sqlite === 'native' ? openNative(file) : openWasm(file, alone);
