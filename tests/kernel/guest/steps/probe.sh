load_devices
run probe quazor phone probe
run unprivileged su -s /bin/sh nobody -c 'quazor phone probe'
