# The folder of the pings' output is gone: a status that cannot be written is a failed ping, and the
# service is recovered. When the folder is back, so is the good news.
start cron
rmdir "$ping_folder"
watch
await 'Exit of general recover after release write lock'
mkdir "$ping_folder"
await 'has been general recoverred successfully.'
unwatch
holds "$errors" "$ping_folder/agent.cron"
