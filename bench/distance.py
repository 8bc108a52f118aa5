#!/usr/bin/env python3
"""Forwards TCP connections and delays what passes by half a round trip in each direction, at any bandwidth. Prints its port.

usage: bench/distance.py SECONDS PORT     SECONDS: of a round trip; PORT: of the server, on this machine"""

import asyncio
import os
import signal
import sys


async def pump(reader, writer, delay, extra=0.0):
    """Passes on what comes, each piece `delay` after it came; the first ones `extra` later: a connection that is made
    here at once takes a round trip elsewhere. Reading never waits for writing."""
    loop, pieces = asyncio.get_running_loop(), asyncio.Queue()
    not_before = loop.time() + extra + delay if extra else 0.0

    async def deliver():
        while True:
            due, piece = await pieces.get()
            await asyncio.sleep(max(0.0, due - loop.time()))
            if not piece:
                writer.write_eof()
                return
            writer.write(piece)
            await writer.drain()
    delivery = asyncio.create_task(deliver())
    piece = b"first"
    while piece:
        try:
            piece = await reader.read(1 << 18)
        except ConnectionError:
            piece = b""
        pieces.put_nowait((max(not_before, loop.time() + delay), piece))
    await delivery


async def forward(reader, writer, port, round_trip):
    there, back = await asyncio.open_connection("127.0.0.1", port)
    await asyncio.gather(pump(reader, back, round_trip / 2, round_trip), pump(there, writer, round_trip / 2),
                         return_exceptions=True)
    for side in (writer, back):
        side.close()


async def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    round_trip, port = float(sys.argv[1]), int(sys.argv[2])
    server = await asyncio.start_server(lambda reader, writer: forward(reader, writer, port, round_trip), "127.0.0.1", 0,
                                        limit=1 << 20)
    print(server.sockets[0].getsockname()[1], flush=True)
    async with server:
        await server.serve_forever()


signal.signal(signal.SIGTERM, lambda *_: os._exit(0))  # with connections open, without a word
asyncio.run(main())
