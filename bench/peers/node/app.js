// The routes.
'use strict';

const { readFileSync } = require('node:fs');
const { join } = require('node:path');
const express = require('express');
const session = require('express-session');
const Links = require('./links');
const SessionStore = require('./session_store');
const { matches } = require('./password');

const LIFETIME = 86400;
const FORM = '<form method="post"><input type="password" name="password"></form>';
const PAGE = readFileSync(join(__dirname, '../page.html'), 'utf8');

// A promise of the session's next state: regenerated or saved.
const after = (current, step) =>
  new Promise((resolve, reject) =>
    current[step]((error) => (error ? reject(error) : resolve())));

exports.build = (database, secret, foldBack) => {
  const links = new Links(database, LIFETIME);
  const app = express();
  app.disable('x-powered-by');
  app.disable('etag'); // nothing of it is to be cached
  app.use(session({
    name: 'sharing_sid',
    secret,
    resave: false,
    saveUninitialized: false,
    cookie: { path: '/sharing', httpOnly: true, sameSite: 'lax' },
    store: new SessionStore(database, LIFETIME, () => {
      if (foldBack) database.exec('PRAGMA wal_checkpoint');
    }),
  }));
  app.use((request, response, next) => {
    response.set('Cache-Control', 'no-store');
    next();
  });

  const admittedTo = (request) =>
    request.session.address === request.socket.remoteAddress
      ? links.findAdmitted(request.params.hash, request.sessionID)
      : undefined;

  app.get('/sharing/:hash', (request, response) => {
    const link = admittedTo(request);
    if (link === undefined) {
      response.status(403).send(FORM);
      return;
    }
    links.prolong(link, request.sessionID); // express-session makes the session last as well
    response.send(PAGE.replace('{hash}', encodeURIComponent(link.hash)));
  });

  app.post('/sharing/:hash', express.urlencoded({ extended: false }), async (request, response) => {
    const link = links.find(request.params.hash);
    if (link === undefined) {
      response.status(404).send('There is no such link.');
      return;
    }
    if (!(await matches(request.body?.password ?? '', link.password))) {
      response.status(403).send('That was not the password.');
      return;
    }
    if (!links.countUse(link)) {
      response.status(410).send('The link is used up.');
      return;
    }
    await after(request.session, 'regenerate');
    request.session.address = request.socket.remoteAddress;
    await after(request.session, 'save');
    links.admit(link, request.sessionID);
    response.redirect(303, `/sharing/${link.hash}`);
  });

  app.post('/sharing/:hash/logout', (request, response) => {
    const link = admittedTo(request);
    if (link !== undefined) links.leave(link, request.sessionID);
    response.send('You are logged out.');
  });
  return app;
};
