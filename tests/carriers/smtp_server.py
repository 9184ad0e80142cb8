#!/usr/bin/python3
"""A server of e-mail for tests, on a free port of loopback, until standard input ends.

Prints its port, then a line for each message that it has. What it does stands in one argument, a JSON object:
  folder    where messages go, each a file of its own, before they are taken on
  tls       [certificate, key]: the server offers STARTTLS
  login     [user, password]: that has to be given
  size      the limit that is told
  replies   {"RCPT": "550 5.1.1 no"}: what is answered to a command; "." is the end of a message
  behind    {"." : "cut"}: the connection ends behind the command, without an answer, or "leave": behind it, or "hang once": the first is not answered
  connections  how many it takes; others are ended at once
  cut       [direction, line]: ends the connection at that line "from" the client or "to" it, from 1, once
"""
import asyncio
import json
import os
import ssl
import sys

try:
    from aiosmtpd.smtp import SMTP, AuthResult
except ImportError:
    print("python3-aiosmtpd is not installed", flush=True)
    sys.exit(0)

wanted = json.loads(sys.argv[1])
taken = 0


def keep(envelope):
    global taken
    taken += 1
    name = os.path.join(wanted["folder"], "%d-%d" % (os.getpid(), taken))
    with open(name + ".part", "wb") as file:
        file.write(("%s\n%s\n" % (envelope.mail_from, ",".join(envelope.rcpt_tos))).encode())
        file.write(envelope.original_content)
        file.flush()
        os.fsync(file.fileno())
    os.rename(name + ".part", name + ".eml")
    print("message", flush=True)


class Handler:
    async def handle_DATA(self, server, session, envelope):
        answer = wanted.get("replies", {}).get(".", "250 2.0.0 taken")
        if answer.startswith("2"):
            keep(envelope)
        if wanted.get("behind", {}).get(".") == "hang once" and taken == 1:
            await asyncio.Event().wait()
        if wanted.get("behind", {}).get(".") == "cut":
            server.transport.abort()
        return answer


class Server(SMTP):
    async def reply_instead(self, verb, method, arg):
        answer = wanted.get("replies", {}).get(verb)
        if answer is None:
            return await method(arg)
        for line in answer.split("\n"):
            await self.push(line)
        if answer.startswith("421"):
            self.transport.close()

    async def smtp_EHLO(self, arg):
        await self.reply_instead("EHLO", super().smtp_EHLO, arg)

    async def smtp_AUTH(self, arg):
        await self.reply_instead("AUTH", super().smtp_AUTH, arg)

    async def smtp_MAIL(self, arg):
        await self.reply_instead("MAIL", super().smtp_MAIL, arg)

    async def smtp_RCPT(self, arg):
        await self.reply_instead("RCPT", super().smtp_RCPT, arg)

    async def smtp_DATA(self, arg):
        await self.reply_instead("DATA", super().smtp_DATA, arg)
        if wanted.get("behind", {}).get(".") == "leave":
            self.transport.close()


def authenticate(server, session, envelope, mechanism, data):
    user, password = wanted["login"]
    given = (data.login.decode(), data.password.decode())
    return AuthResult(success=given == (user, password), handled=False)


connections = 0


def make_server():
    global connections
    connections += 1
    if connections > wanted.get("connections", connections):
        return Refusal()
    options = {"hostname": "mail.example", "data_size_limit": wanted.get("size", 1 << 30)}
    if "tls" in wanted:
        options["tls_context"] = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        options["tls_context"].load_cert_chain(*wanted["tls"])
    if "login" in wanted:
        options.update(authenticator=authenticate, auth_required=True, auth_require_tls="tls" in wanted)
    return Server(Handler(), **options)


class Refusal(asyncio.Protocol):
    def connection_made(self, transport):
        transport.abort()


class Cutter:
    """Passes lines on, until one is the last."""

    def __init__(self, port):
        self.port = port
        self.lines = {"from": 0, "to": 0}
        self.is_over = False

    async def serve(self, reader, writer):
        inner_reader, inner_writer = await asyncio.open_connection("127.0.0.1", self.port)
        await asyncio.gather(
            self.pass_on("from", reader, inner_writer, writer), self.pass_on("to", inner_reader, writer, inner_writer)
        )

    async def pass_on(self, direction, reader, writer, other):
        try:
            while line := await reader.readline():
                self.lines[direction] += 1
                if not self.is_over and [direction, self.lines[direction]] == wanted["cut"]:
                    self.is_over = True
                    # What was passed on so far gets there first.
                    await writer.drain()
                    break
                writer.write(line)
                await writer.drain()
        except OSError:
            pass
        for end in (writer, other):
            end.close()


async def main():
    loop = asyncio.get_running_loop()
    server = await loop.create_server(make_server, "127.0.0.1", 0)
    port = server.sockets[0].getsockname()[1]
    if "cut" in wanted:
        cutter = Cutter(port)
        outer = await asyncio.start_server(cutter.serve, "127.0.0.1", 0)
        port = outer.sockets[0].getsockname()[1]
    print(port, flush=True)
    await loop.run_in_executor(None, sys.stdin.read)
    os._exit(0)


asyncio.run(main())
