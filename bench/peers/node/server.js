// Starts as many workers as PEER_WORKERS says; one worker is this process itself.
'use strict';

const cluster = require('node:cluster');
const { randomBytes } = require('node:crypto');

const workers = Number(process.env.PEER_WORKERS);

if (cluster.isPrimary && workers > 1) {
  const secret = randomBytes(32).toString('hex');
  for (let count = 0; count < workers; ++count) cluster.fork({ PEER_SECRET: secret });
} else {
  const { build } = require('./app');
  const { open } = require('./database');
  const database = open(process.env.PEER_SQLITE, process.env.PEER_DATABASE, workers === 1);
  const secret = process.env.PEER_SECRET ?? randomBytes(32).toString('hex');
  build(database, secret, process.env.PEER_FOLD_BACK === '1')
    .listen(Number(process.env.PEER_PORT), '127.0.0.1');
}
