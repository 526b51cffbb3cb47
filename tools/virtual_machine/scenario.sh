# What the scripts of scenarios are made of. Each scenario begins with devices that are plugged in anew.

say() { echo "guest: $*"; }

# until CONDITION...   waits until the command succeeds, at most 20 s of the guest's time
until_true() {
    tries=0
    until eval "$*"; do
        tries=$((tries + 1))
        [ $tries -lt 1000 ] || { say "waited in vain: $*"; return 1; }
        usleep 20000
    done
}

# camera COMMAND... and sensor COMMAND...   plug in a device that obeys these commands
camera() { plug camera "$@" && until_true "[ -e /dev/video1 ]"; }
sensor() { plug sensor "$@" && until_true "[ -e /dev/hidraw0 ]"; }
plug() {
    device=$1
    shift
    rm -f "/tmp/$device"
    mkfifo "/tmp/$device"
    "vm_$device" "$@" <>"/tmp/$device" >"/tmp/$device.log" 2>&1 &
    echo $! >"/tmp/$device.pid"
}

# tell DEVICE COMMAND   returns when the device has obeyed
tell() {
    device=$1
    shift
    echo "$*" >"/tmp/$device"
    until_true "grep -qxF '$*' /tmp/$device.log"
}

# once SCENARIO TEXT COMMAND   runs the command when zrlab has logged the text
once() {
    mkdir -p "/results/$1"
    : >"/results/$1/log"
    { until_true "grep -qF '$2' '/results/$1/log'" && eval "$3"; } &
    echo $! >>/tmp/waiting
}

# play SCENARIO COMMAND...   runs the command, keeps what it says, takes the devices away
play() {
    results=/results/$1
    shift
    mkdir -p "$results"
    say "start ${results#/results/}"
    timeout 60 "$@" >>"$results/log" 2>&1
    echo $? >"$results/status"
    for process in $(cat /tmp/*.pid /tmp/waiting 2>/dev/null); do
        kill "$process" 2>/dev/null && wait "$process"
    done 2>/dev/null
    rm -f /tmp/*.pid /tmp/waiting
    cp /tmp/camera.log /tmp/sensor.log "$results" 2>/dev/null
    rm -f /tmp/camera.log /tmp/sensor.log
    until_true "[ ! -e /dev/video1 ] && [ ! -e /dev/hidraw0 ]"
    say "done ${results#/results/}"
}

# Moves each counter of the station that is not constant, by an amount of its own.
move_counters() {
    add 7 /sys/module/vivid/parameters/vivid_debug
    add 5000 "$(echo /sys/class/hwmon/*/temp1_max)"
    repeat 5 ping -c 1 127.0.0.1
    repeat 6 wget -q http://127.0.0.1:9/
    repeat 4 eval 'for brightness in 100 128; do v4l2-ctl -d /dev/video10 -c brightness=$brightness; done'
    traceroute -q 1 127.0.0.1
    repeat 2 eval 'for carrier in 0 1; do echo $carrier >/sys/class/net/dummy0/carrier; done'
    ping -c 2 -W 1 10.0.0.2
} >/dev/null 2>&1

add() { echo $(($(cat "$2") + $1)) >"$2"; }

# repeat N COMMAND...
repeat() {
    count=$1
    shift
    while [ "$count" -gt 0 ]; do
        "$@"
        count=$((count - 1))
    done
}

# A network device that goes nowhere; its counters begin at zero.
add_dummy() {
    modprobe dummy numdummies=1
    ip link set dummy0 up
    ip address add 10.0.0.1/24 dev dummy0
}

# A camera that the kernel plays: one video node and one metadata node.
add_vivid() { modprobe vivid n_devs=1 node_types=0x20001 num_inputs=1 input_types=0 vid_cap_nr=10 meta_cap_nr=11; }
