# The example configuration: php8.2-fpm, which makes nginx's pages, is killed. nginx still runs, but
# its check of a page fails, and so both are restarted.
cp /opt/project/config/nginx-php-fpm.xml "$configuration"
mkdir -p /run/www
echo '<?php echo "up";' >/run/www/up.php
start php8.2-fpm nginx
until_true curl -fso /dev/null localhost/up.php
nginx=$(pid_of nginx) php=$(pid_of php8.2-fpm)
watch
await 'ping result is service: ok'
slay php8.2-fpm
await 'Functionalping failed for service nginx. Try to ping more times now'
await 'has been successfully functional recovered.'
unwatch
was_restarted nginx "$nginx"
was_restarted php8.2-fpm "$php"
is up "$(curl -fs localhost/up.php)"
