"""What the pages take for given, by page: shell lines that run before the page's own, as root. Every
page has besides what world.py lays out: the programs installed and configured, a web server, files in
/srv/shares, alice and the other accounts of scripts/private-root."""

VISIT = "curl --silent --output /dev/null http://localhost/sharing/"

GIVEN = {
    # Units and configuration where the packages have them.
    "docs/packages.md": """
        cp packaging/systemd/* /etc/systemd/system/
        mkdir /etc/tuvosharing
        mv /usr/tuvo/etc/tuvosharing.conf /etc/tuvosharing/
        ln -s /etc/tuvosharing/tuvosharing.conf /usr/tuvo/etc/
        """,
    # The link that is edited.
    "docs/cli.md": "tuvosharing create --project file --path /srv/shares/report.pdf --hash abcDEF123",
    # A copy of a day that has been, a refused login and a link with the number 7 for the log. The
    # page makes the command's name itself.
    "docs/deployment.md": f"""
        for n in 1 2 3 4 5 6 7; do
          printf 'tea\\n' |
            tuvosharing create --project file --path /srv/shares/report.pdf --hash link$n --password-stdin
        done
        {VISIT}link7 --data password=coffee
        tuvosharing backup /var/backups/sharing-2026-12-31.db
        rm /usr/local/sbin/tuvosharing
        """,
}

# What has to be so when a page is through.
AFTERWARDS = {
    # The line for cron, as cron would start it.
    "docs/recipes.md": """
        line=$(cut -d' ' -f7- /etc/cron.d/tuvosharing)
        [ "$(cut -d' ' -f6 /etc/cron.d/tuvosharing)" = root ]
        tuvosharing show gone >/dev/null
        printed=$(env -i PATH=/usr/bin:/bin HOME=/root SHELL=/bin/sh /bin/sh -c "$line")
        [ -z "$printed" ]
        ! tuvosharing show gone
        tuvosharing show summer24
        """,
    "docs/deployment.md": f"""
        [ "$(stat -c %U:%G:%a /usr/tuvo/bin/sharing.cgi)" = root:www-data:4750 ]
        [ "$(stat -c %u:%g:%a /usr/tuvo/etc/private/session/sharing.db)" = 1:1:660 ]
        tuvosharing show link7 >/dev/null
        tuvosharing check
        lighttpd -tt -f /etc/lighttpd/lighttpd.conf
        lighttpd -p -f /etc/lighttpd/lighttpd.conf | grep /usr/tuvo/bin/sharing.cgi >/dev/null
        id -nG www-data | grep -w shadow >/dev/null
        """,
}
