<?php

declare(strict_types=1);

/** Sessions in the database. Each use of one makes it last a day from then. */
final class SessionStore implements SessionHandlerInterface, SessionUpdateTimestampHandlerInterface
{
    /** @var array<string, string> what validateId() has read and read() will be asked for */
    private array $found = [];

    public function __construct(private PDO $database, private int $lifetime)
    {
    }

    public function open(string $path, string $name): bool
    {
        return true;
    }

    public function close(): bool
    {
        return true;
    }

    public function validateId(string $id): bool
    {
        $rows = $this->database->prepare('SELECT data FROM session WHERE sid = ? AND expires_at > ?');
        $rows->execute([$id, time()]);
        $data = $rows->fetchColumn();
        if ($data === false) {
            return false;
        }
        $this->found[$id] = $data;
        return true;
    }

    public function read(string $id): string|false
    {
        return isset($this->found[$id]) || $this->validateId($id) ? $this->found[$id] : '';
    }

    public function write(string $id, string $data): bool
    {
        return $this->database->prepare(
            'INSERT INTO session (sid, data, expires_at) VALUES (?, ?, ?)
             ON CONFLICT (sid) DO UPDATE SET data = excluded.data, expires_at = excluded.expires_at'
        )->execute([$id, $data, time() + $this->lifetime]);
    }

    public function updateTimestamp(string $id, string $data): bool
    {
        return $this->database->prepare('UPDATE session SET expires_at = ? WHERE sid = ?')
            ->execute([time() + $this->lifetime, $id]);
    }

    public function destroy(string $id): bool
    {
        unset($this->found[$id]);
        return $this->database->prepare('DELETE FROM session WHERE sid = ?')->execute([$id]);
    }

    public function gc(int $max_lifetime): int|false
    {
        $ended = $this->database->prepare('DELETE FROM session WHERE expires_at <= ?');
        $ended->execute([time()]);
        return $ended->rowCount();
    }
}
