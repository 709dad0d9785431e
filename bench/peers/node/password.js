// Digests of passwords, in the form SALT:DIGEST.
'use strict';

const { randomBytes, scrypt, scryptSync, timingSafeEqual } = require('node:crypto');

const LENGTH = 32;

exports.digest = (password) => {
  const salt = randomBytes(16);
  return `${salt.toString('hex')}:${scryptSync(password, salt, LENGTH).toString('hex')}`;
};

// A promise of whether it is the one.
exports.matches = (password, stored) =>
  new Promise((resolve, reject) => {
    const [salt, digest] = stored.split(':').map((part) => Buffer.from(part, 'hex'));
    scrypt(password, salt, LENGTH, (error, key) =>
      error ? reject(error) : resolve(timingSafeEqual(key, digest)));
  });
