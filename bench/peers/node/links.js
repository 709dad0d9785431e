// Links, and which sessions are admitted to them.
'use strict';

const now = () => Math.floor(Date.now() / 1000);

function inForce(link) {
  const moment = now();
  const fits =
    link !== undefined &&
    link.enabled === 1 &&
    link.start_at <= moment &&
    (link.expire_at === 0 || link.expire_at > moment);
  return fits ? link : undefined;
}

class Links {
  constructor(database, lifetime) {
    this.lifetime = lifetime;
    this.select = database.prepare('SELECT * FROM link WHERE hash = ?');
    this.selectAdmitted = database.prepare(
      `SELECT link.* FROM link JOIN token ON token.link_id = link.id
       WHERE link.hash = ? AND token.sid = ? AND token.expires_at > ?`);
    this.count = database.prepare(
      `UPDATE link SET uses = uses + 1
       WHERE id = ? AND (uses_allowed = 0 OR uses < uses_allowed)`);
    this.insert = database.prepare(
      'INSERT INTO token (sid, link_id, expires_at) VALUES (?, ?, ?)');
    this.update = database.prepare(
      'UPDATE token SET expires_at = ? WHERE sid = ? AND link_id = ?');
    this.remove = database.prepare('DELETE FROM token WHERE sid = ? AND link_id = ?');
  }

  // The link of that name while it is in force.
  find(hash) {
    return inForce(this.select.get(hash));
  }

  // The link of that name when both it and the session's token for it are in force.
  findAdmitted(hash, sid) {
    return inForce(this.selectAdmitted.get(hash, sid, now()));
  }

  // Counts one use; false when all are taken.
  countUse(link) {
    return this.count.run(link.id) === 1;
  }

  admit(link, sid) {
    this.insert.run(sid, link.id, now() + this.lifetime);
  }

  // Makes an admission last a day from now.
  prolong(link, sid) {
    this.update.run(now() + this.lifetime, sid, link.id);
  }

  leave(link, sid) {
    this.remove.run(sid, link.id);
  }
}

module.exports = Links;
