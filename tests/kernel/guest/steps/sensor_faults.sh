load_devices
capture absent --set images=1 --set timeout=2

plug_in two --devices 2
capture ambiguous --set images=1 --set timeout=2
unplug two

plug_in silent --ignore 171
capture no_answer --set images=1 --set timeout=2
unplug silent

plug_in unwilling --refuse 172
capture refused --set images=1 --set timeout=2
unplug unwilling

plug_in leaving --remove-after 30
capture removed --set images=100 --set timeout=10
unplug leaving

plug_in pausing --stop-after 30
capture timed_out --set images=100 --set timeout=2
unplug pausing

plug_in long --length 800
capture over_long --set images=30 --set timeout=2
unplug long

plug_in healthy
capture next --set images=30 --set timeout=2
unplug healthy
