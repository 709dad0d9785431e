<?php

declare(strict_types=1);

/** The one connection of a worker: it stays open from request to request. */
final class Database
{
    public static function open(): PDO
    {
        $database = new PDO('sqlite:' . getenv('PEER_DATABASE'), null, null, [
            PDO::ATTR_PERSISTENT => true,
            PDO::ATTR_TIMEOUT => 10,
            PDO::ATTR_ERRMODE => PDO::ERRMODE_EXCEPTION,
            PDO::ATTR_DEFAULT_FETCH_MODE => PDO::FETCH_ASSOC,
        ]);
        // WAL is the file's own; these two are the connection's, and nobody tells whether it is new.
        $database->exec('PRAGMA foreign_keys = ON; PRAGMA synchronous = NORMAL');
        return $database;
    }
}
