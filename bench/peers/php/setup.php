<?php

// Makes the database, with one link. Arguments: the file, the schema, the link's name, its password,
// the uses that it allows.

declare(strict_types=1);

[, $file, $schema, $hash, $password, $uses] = $argv;
$database = new PDO("sqlite:$file");
$database->exec('PRAGMA journal_mode = WAL');
$database->exec(file_get_contents($schema));
$database->prepare('INSERT INTO link (hash, password, uses_allowed) VALUES (?, ?, ?)')
    ->execute([$hash, password_hash($password, PASSWORD_DEFAULT), (int) $uses]);
