#!/bin/sh
printf '#!/bin/sh\nservice cron stop\n' >/opt/stop-cron
chmod 755 /opt/stop-cron
if [ "$1" = right ]; then
    chmod 600 right.xml
fi
