# Where the output should go there is a folder: it opens, and has no first line.
start cron
mkdir "$ping_folder/agent.cron"
watch
await 'Try to general ping more times now'
rmdir "$ping_folder/agent.cron"
await 'General ping successful!'
unwatch
