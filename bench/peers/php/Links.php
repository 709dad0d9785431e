<?php

declare(strict_types=1);

/** Links, and which sessions are admitted to them. */
final class Links
{
    public function __construct(private PDO $database, private int $lifetime)
    {
    }

    /** The link of that name while it is in force, else null. */
    public function find(string $hash): ?array
    {
        return $this->inForce('SELECT * FROM link WHERE hash = ?', [$hash]);
    }

    /** The link of that name when both it and the session's token for it are in force, else null. */
    public function findAdmitted(string $hash, string $session): ?array
    {
        return $this->inForce(
            'SELECT link.* FROM link JOIN token ON token.link_id = link.id
             WHERE link.hash = ? AND token.sid = ? AND token.expires_at > ?',
            [$hash, $session, time()]
        );
    }

    /** Counts one use; false when all are taken. */
    public function countUse(int $link): bool
    {
        $counted = $this->database->prepare(
            'UPDATE link SET uses = uses + 1
             WHERE id = ? AND (uses_allowed = 0 OR uses < uses_allowed)'
        );
        $counted->execute([$link]);
        return $counted->rowCount() === 1;
    }

    public function admit(int $link, string $session): void
    {
        $this->database->prepare('INSERT INTO token (sid, link_id, expires_at) VALUES (?, ?, ?)')
            ->execute([$session, $link, time() + $this->lifetime]);
    }

    /** Makes an admission last a day from now. */
    public function prolong(int $link, string $session): void
    {
        $this->database->prepare('UPDATE token SET expires_at = ? WHERE sid = ? AND link_id = ?')
            ->execute([time() + $this->lifetime, $session, $link]);
    }

    public function leave(int $link, string $session): void
    {
        $this->database->prepare('DELETE FROM token WHERE sid = ? AND link_id = ?')
            ->execute([$session, $link]);
    }

    private function inForce(string $query, array $values): ?array
    {
        $rows = $this->database->prepare($query);
        $rows->execute($values);
        $link = $rows->fetch();
        $now = time();
        if (
            $link === false || $link['enabled'] !== 1 || $link['start_at'] > $now
            || ($link['expire_at'] !== 0 && $link['expire_at'] <= $now)
        ) {
            return null;
        }
        return $link;
    }
}
