#!/bin/sh
# Two programs of the administrator's: one two folders below another user's, and one that a group
# may write, that is reached by a link in another user's folder and lies in one that is open to all.
mkdir -p /opt/other/team/bin /opt/links /opt/open
printf '#!/bin/sh\nservice cron restart\n' >/opt/other/team/bin/restart-cron
printf '#!/bin/sh\necho service: ok\n' >/opt/open/check-cron
chmod 755 /opt/other/team/bin/restart-cron /opt/open/check-cron
ln -s ../open/check-cron /opt/links/check-cron
if [ "$1" = wrong ]; then
    chmod 666 wrong.xml
    chown 65534 /opt/other
    chown 65534 /opt/links
    chgrp 65534 /opt/open/check-cron
    chmod 775 /opt/open/check-cron
    chmod 777 /opt/open
    chmod 1777 /opt/varden/tolk/bin
else
    chmod 1777 /opt/open
fi
