#!/bin/sh
# Two programs of the administrator's, one behind a link in a folder that is open to all.
mkdir -p /opt/open /opt/local
printf '#!/bin/sh\nservice cron start\n' >/opt/local/start-cron
printf '#!/bin/sh\necho service: ok\n' >/opt/open/check-cron
chmod 755 /opt/local/start-cron /opt/open/check-cron
ln -s /opt/open/check-cron /opt/local/check-cron
if [ "$1" = wrong ]; then
    chmod 666 wrong.xml
    chmod 1777 /opt/open
    chown 65534 /opt/local/start-cron
    chmod 775 /opt/varden/tolk/bin
    chgrp 65534 /opt/varden/tolk/bin
fi
