// Sessions in the database, for express-session. Each use of one makes it last a day from then.
'use strict';

const { Store } = require('express-session');

const now = () => Math.floor(Date.now() / 1000);

class SessionStore extends Store {
  // afterTouch() is called when a request's last statement has been run.
  constructor(database, lifetime, afterTouch) {
    super();
    this.lifetime = lifetime;
    this.afterTouch = afterTouch;
    this.select = database.prepare('SELECT data FROM session WHERE sid = ? AND expires_at > ?');
    this.upsert = database.prepare(
      `INSERT INTO session (sid, data, expires_at) VALUES (?, ?, ?)
       ON CONFLICT (sid) DO UPDATE SET data = excluded.data, expires_at = excluded.expires_at`);
    this.prolong = database.prepare('UPDATE session SET expires_at = ? WHERE sid = ?');
    this.remove = database.prepare('DELETE FROM session WHERE sid = ?');
  }

  get(sid, callback) {
    this.answer(callback, () => {
      const row = this.select.get(sid, now());
      return row && JSON.parse(row.data);
    });
  }

  set(sid, session, callback) {
    this.answer(callback, () => {
      this.upsert.run(sid, JSON.stringify(session), now() + this.lifetime);
    });
  }

  touch(sid, session, callback) {
    this.answer(callback, () => {
      this.prolong.run(now() + this.lifetime, sid);
      this.afterTouch();
    });
  }

  destroy(sid, callback) {
    this.answer(callback, () => {
      this.remove.run(sid);
    });
  }

  answer(callback, work) {
    let result;
    try {
      result = work();
    } catch (error) {
      callback?.(error);
      return;
    }
    callback?.(null, result);
  }
}

module.exports = SessionStore;
