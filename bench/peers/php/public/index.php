<?php

declare(strict_types=1);

require __DIR__ . '/../Database.php';
require __DIR__ . '/../SessionStore.php';
require __DIR__ . '/../Links.php';

const LIFETIME = 86400;
const COOKIE = 'sharing_sid';

function answer(int $status, string $text): never
{
    http_response_code($status);
    header('Cache-Control: no-store');
    header('Content-Type: text/html; charset=utf-8');
    echo $text;
    exit;
}

/** Whether the visitor has a session that is in force and was begun at this address. */
function resumeSession(): bool
{
    return isset($_COOKIE[COOKIE]) && session_start()
        && ($_SESSION['address'] ?? null) === $_SERVER['REMOTE_ADDR'];
}

function visit(PDO $database, Links $links, string $hash): never
{
    $link = resumeSession() ? $links->findAdmitted($hash, session_id()) : null;
    if ($link === null) {
        answer(403, '<form method="post"><input type="password" name="password"></form>');
    }
    $links->prolong($link['id'], session_id());
    session_write_close(); // makes the session last as well
    if (getenv('PEER_FOLD_BACK') === '1') {
        $database->exec('PRAGMA wal_checkpoint');
    }
    $page = file_get_contents(__DIR__ . '/../../page.html');
    answer(200, str_replace('{hash}', htmlspecialchars($hash), $page));
}

function login(Links $links, string $hash): never
{
    $link = $links->find($hash);
    if ($link === null) {
        answer(404, 'There is no such link.');
    }
    if (!password_verify($_POST['password'] ?? '', $link['password'])) {
        answer(403, 'That was not the password.');
    }
    if (!$links->countUse($link['id'])) {
        answer(410, 'The link is used up.');
    }
    session_start();
    session_regenerate_id(true);
    $_SESSION['address'] = $_SERVER['REMOTE_ADDR'];
    $session = session_id();
    session_write_close();
    $links->admit($link['id'], $session);
    header("Location: /sharing/$hash");
    answer(303, '');
}

function logout(Links $links, string $hash): never
{
    $link = resumeSession() ? $links->findAdmitted($hash, session_id()) : null;
    if ($link !== null) {
        $links->leave($link['id'], session_id());
    }
    answer(200, 'You are logged out.');
}

$path = parse_url($_SERVER['REQUEST_URI'], PHP_URL_PATH);
if (!preg_match('#^/sharing/([A-Za-z0-9_-]{3,64})(/logout)?$#', (string) $path, $parts)) {
    answer(404, 'There is no such page.');
}
$database = Database::open();
$links = new Links($database, LIFETIME);
session_set_save_handler(new SessionStore($database, LIFETIME), true);
session_name(COOKIE);
session_set_cookie_params(['path' => '/sharing', 'httponly' => true, 'samesite' => 'Lax']);

$posted = $_SERVER['REQUEST_METHOD'] === 'POST';
if (isset($parts[2])) {
    $posted ? logout($links, $parts[1]) : answer(405, '');
}
$posted ? login($links, $parts[1]) : visit($database, $links, $parts[1]);
