#!/bin/sh
# factory_files.sh each|all: makes the files of a factory set-up under the directory in ROOT with sed, ln and
# sync: a sed for each interface's file, or one for all of them.
set -eu
scripts=$ROOT/etc/sysconfig/network-scripts
drop='/^#/d; /^$/d'
ln -s /usr/share/zoneinfo/Etc/GMT "$ROOT/etc/localtime.new"
mv -T "$ROOT/etc/localtime.new" "$ROOT/etc/localtime"
sed -i 's|^ZONE=.*|ZONE="Etc/GMT"|' "$ROOT/etc/sysconfig/clock"

sed -i '/^UUID=/d; /^HWADDR=/d; s/^ONBOOT=.*/ONBOOT=no/
    s/^IPV6INIT=.*/IPV6INIT=no/; s/^IPV6_AUTOCONF=.*/IPV6_AUTOCONF=no/
    $aNM_CONTROLLED=no' "$scripts/ifcfg-eth0"
every="$drop; \$a"'DEFROUTE=no\nPEERDNS=no'
if [ "$1" = all ]; then
    sed -i -s "$every" "$scripts"/ifcfg-*
else
    for file in "$scripts"/ifcfg-*; do sed -i "$every" "$file"; done
fi

sed -i 's/\(eth0\.disable_ipv6 =\).*/\1 1/' "$ROOT/etc/sysctl.d/velmora"
(cd "$scripts" && printf '%s\n' ifcfg-*) | sort -V |
    sed 's/ifcfg-\(.*\)/net.ipv6.conf.\1.accept_ra_defrtr = 0/' >>"$ROOT/etc/sysctl.d/velmora"
sed -i "\$aHOSTNAME=rhx416-41600123
    $drop; /^GATEWAY=/d; /^IPV6_DEFAULTGW=/d; /^HOSTNAME=/d" \
    "$ROOT/etc/sysconfig/network"
if [ "$1" = all ]; then
    sync "$scripts"/ifcfg-* "$ROOT/etc/sysctl.d/velmora" "$ROOT/etc/sysconfig/network"
else
    for file in "$scripts"/ifcfg-* "$ROOT/etc/sysctl.d/velmora" "$ROOT/etc/sysconfig/network"; do
        sync "$file"
    done
fi
