load_devices
load_usb
plug_in_usb sensor --rate 60 --first-frame 1000
capture images --set images=120 --set timeout=5
unplug sensor

plug_in_usb unwilling --refuse 172
capture refused --set images=1 --set timeout=2
unplug unwilling

plug_in_usb silent --ignore 171
capture no_answer --set images=1 --set timeout=2
unplug silent

plug_in_usb pausing --stop-after 30
capture timed_out --set images=100 --set timeout=2
unplug pausing

plug_in_usb leaving --remove-after 30
capture removed --set images=100 --set timeout=10
unplug leaving

plug_in_usb healthy
capture next --set images=30 --set timeout=2
unplug healthy
ports_in_use >"$out/ports"
