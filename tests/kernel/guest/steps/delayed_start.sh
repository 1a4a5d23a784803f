load_devices
export DELAYED_BUS=platform:vivid-002 DELAYED_MILLISECONDS=100
run late env LD_PRELOAD=/usr/bin/delayed_start.so ASAN_OPTIONS="$ASAN_OPTIONS:verify_asan_link_order=0" \
  quazor run CameraSyncDiagnostic.Back --phone linux:vivid --profile none --format json --set duration=3.015
diagnose punctual CameraSyncDiagnostic.Back --set duration=2.015
