"""The validators' peer: the same rules with Python's ipaddress. Each interface exists, its address
is a host's in its subnet, no two subnets overlap, and gateway and servers lie in one of them."""
import ipaddress
import socket


def check_host(address, network):
    no_host = address == network.network_address or (
        network.version == 4 and address == network.broadcast_address)
    if no_host or address.is_loopback or address.is_multicast:
        raise ValueError(address)


def own_interface(name, text):
    socket.if_nametoindex(name)
    own = ipaddress.ip_interface(text)
    check_host(own.ip, own.network)
    return own


def check_overlap(interfaces):
    for a in interfaces:
        if any(b.ip in a.network for b in interfaces if b is not a):
            raise ValueError(a)


def check_reach(interfaces, text):
    address = ipaddress.ip_address(text)
    networks = [own.network for own in interfaces if address in own.network]
    if not networks:
        raise ValueError(address)
    for network in networks:
        check_host(address, network)


def check(count):
    """Checks the setting of so many interfaces that calls.cpp checks too."""
    ipv4 = [own_interface(f"eth{i}", f"10.{i // 256}.{i % 256}.2/24") for i in range(count)]
    ipv6 = [own_interface(f"eth{i}", f"fd00:{i:x}::2/64") for i in range(count)]
    check_overlap(ipv4)
    check_overlap(ipv6)
    check_reach(ipv6, "fd00:0::1")
    for text in ("10.0.0.1", "10.0.0.3", "10.0.0.4"):
        check_reach(ipv4, text)
