load_devices
load_usb
plug_in_usb before
unplug before
capture absent --set images=1 --set timeout=2

# It does not answer the report, so that it is certainly unplugged while the program waits.
for report in 171 172; do
  plug_in_usb ignoring_$report --ignore $report
  {
    usleep 1500000
    kill -TERM $sensor
  } &
  capture set_up_$report --set images=1 --set timeout=10
  unplug ignoring_$report
done

for reports in 0 1 2 29; do
  plug_in_usb leaving_$reports --remove-after $reports
  capture after_$reports --set images=30 --set timeout=10
  unplug leaving_$reports
done

# One period after the last image, when the program closes the sensor.
plug_in_usb leaving_at_stop --remove-after 30
capture at_stop --set images=30 --set timeout=10
unplug leaving_at_stop

plug_in_usb healthy
capture next --set images=30 --set timeout=2
unplug healthy
ports_in_use >"$out/ports"
