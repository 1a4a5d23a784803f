load_devices
plug_in sensor
blank=/sys/class/graphics/fb0/blank
echo 4 >$blank
cat /sys/class/drm/card0-Virtual-1/dpms >"$out/dpms"
capture dark --set images=5 --set timeout=2
echo 0 >$blank
echo off >/sys/class/drm/card0-Virtual-1/status
capture unplugged --set images=5 --set timeout=2
echo detect >/sys/class/drm/card0-Virtual-1/status
capture next --set images=5 --set timeout=2
unplug sensor
