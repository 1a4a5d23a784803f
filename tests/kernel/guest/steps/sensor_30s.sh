load_devices
plug_in sensor --rate 60 --first-frame 1000
capture images --set images=1800 --set timeout=60
unplug sensor
