"""The rules of the validators of a network setting with Python's ipaddress: the interface exists, its
address is a host's in its subnet, no two subnets overlap, gateway and servers lie in one of them."""
import ipaddress
import socket


def check_interfaces(settings):
    found = []
    for name, address, prefix, address6, prefix6 in settings:
        socket.if_nametoindex(name)
        pair = []
        for text, length in ((address, prefix), (address6, prefix6)):
            own = ipaddress.ip_interface(f"{text}/{length}")
            if own.is_loopback or own.is_multicast or own.ip == own.network.network_address:
                raise ValueError(text)
            if own.version == 4 and own.ip == own.network.broadcast_address:
                raise ValueError(text)
            pair.append(own)
        found.append(pair)
    return found


def check_pairs(interfaces):
    for i, a in enumerate(interfaces):
        for j, b in enumerate(interfaces):
            if i != j and b.ip in a.network:
                raise ValueError(f"{a} and {b} have overlapped")


def check_reach(interfaces, text):
    address = ipaddress.ip_address(text)
    inside = False
    for own in interfaces:
        if address in own.network:
            if address in (own.network.network_address, own.network.broadcast_address):
                raise ValueError(text)
            inside = True
    if not inside:
        raise ValueError(text)


def check_one(setting, gateway, gateway6, servers):
    """As vlsys_address_check."""
    [(own, own6)] = check_interfaces([setting])
    check_reach([own], gateway)
    check_reach([own6], gateway6)
    for server in servers:
        check_reach([own], server)


def check_all(settings, gateway, gateway6, servers):
    """As vlsys_address_check2."""
    found = check_interfaces(settings)
    for family, gateway_text in ((0, gateway), (1, gateway6)):
        interfaces = [pair[family] for pair in found]
        check_pairs(interfaces)
        check_reach(interfaces, gateway_text)
    for server in servers:
        check_reach([pair[0] for pair in found], server)
