"""Certificates, and servers that show them."""

import hashlib
import http.client
import json
import socket
import ssl
import subprocess
import threading


def openssl(*arguments, **options):
    return subprocess.run(["openssl", *map(str, arguments)], check=True, capture_output=True, **options).stdout


class Authority:
    """A certificate authority in a directory, made by the openssl command."""

    def __init__(self, directory):
        self.directory = directory
        self.certificate = directory / "authority.pem"
        openssl("req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes",
                "-subj", "/CN=authority", "-days", "30", "-keyout", directory / "authority.key",
                "-out", self.certificate)
        self.certificate.chmod(0o644)

    def sign(self, name, host="localhost", expired=False):
        """A certificate for a host. @return the files of certificate and key"""
        certificate, key = self.directory / f"{name}.pem", self.directory / f"{name}.key"
        request = openssl("req", "-new", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes",
                          "-subj", f"/CN={host}", "-addext", f"subjectAltName=DNS:{host}", "-keyout", key)
        database = self.directory / f"{name}.db"
        database.write_text("")
        settings = self.directory / f"{name}.cnf"
        settings.write_text(
            f"[ca]\ndefault_ca=own\n[own]\ndatabase={database}\nrand_serial=yes\npolicy=any\n"
            f"new_certs_dir={self.directory}\ndefault_md=sha256\ncopy_extensions=copy\n"
            "[any]\ncommonName=supplied\n")
        start, end = ("20200101000000Z", "20200201000000Z") if expired else (
            "20200101000000Z", "20991231000000Z")
        openssl("ca", "-batch", "-config", settings, "-cert", self.certificate, "-keyfile",
                self.directory / "authority.key", "-startdate", start, "-enddate", end, "-notext",
                "-in", "/dev/stdin", "-out", certificate, input=request)
        certificate.chmod(0o644)
        return certificate, key


def public_key_pin(certificate):
    key = openssl("x509", "-in", certificate, "-pubkey", "-noout")
    der = openssl("pkey", "-pubin", "-outform", "DER", input=key)
    return "sha256//" + openssl("base64", "-A", input=hashlib.sha256(der).digest()).decode()


class TlsServer:
    """Accepts TLS connections on a port of its own and hands each to serve()."""

    def __init__(self, certificate, key):
        self.context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        self.context.load_cert_chain(certificate, key)
        self.listener = socket.create_server(("127.0.0.1", 0))
        self.port = self.listener.getsockname()[1]
        self.url = f"https://localhost:{self.port}/webapi/entry.cgi"
        self.served = 0  # connections whose handshake was completed
        threading.Thread(target=self.accept, daemon=True).start()

    def accept(self):
        while True:
            try:
                connection, _ = self.listener.accept()
            except OSError:
                return
            threading.Thread(target=self.begin, args=(connection,), daemon=True).start()

    def begin(self, connection):
        try:
            connection.settimeout(30)
            with self.context.wrap_socket(connection, server_side=True) as encrypted:
                self.served += 1
                self.serve(encrypted)
        except (OSError, ValueError):
            pass  # the other side did not like what it saw

    def serve(self, connection):
        raise NotImplementedError

    def stop(self):
        self.listener.close()


class TlsFront(TlsServer):
    """Passes decrypted bytes on to a web server of this machine, and its answer back."""

    def __init__(self, certificate, key, port, rewrite=lambda first: first):
        super().__init__(certificate, key)
        self.backend = port
        self.rewrite = rewrite

    def serve(self, connection):
        with socket.create_connection(("127.0.0.1", self.backend), timeout=30) as backend:
            backend.sendall(self.rewrite(connection.recv(65536)))
            back = threading.Thread(target=self.pump, args=(backend, connection), daemon=True)
            back.start()
            self.pump(connection, backend)
            back.join()

    @staticmethod
    def pump(source, target):
        try:
            while piece := source.recv(65536):
                target.sendall(piece)
            target.shutdown(socket.SHUT_WR)
        except OSError:
            pass


class ScriptedHost(TlsServer):
    """Reads one request and answers as its `answer` says, or tells what it was sent."""

    def __init__(self, certificate, key):
        super().__init__(certificate, key)
        self.answer = None  # a function of the connection, or bytes
        self.requests = []  # (request line, headers, bytes and digest of the body)

    def serve(self, connection):
        stream = connection.makefile("rb")
        line = stream.readline().decode()
        if not line:
            return  # the other side thought better of it
        headers = http.client.parse_headers(stream)
        left, digest, body = int(headers["Content-Length"]), hashlib.sha256(), b""
        while left > 0:
            piece = stream.read(min(left, 65536))
            if not piece:
                return
            left -= len(piece)
            digest.update(piece)
            body += piece if len(body) < 65536 else b""
        self.requests.append((line, headers, body, digest.hexdigest()))
        if callable(self.answer):
            self.answer(connection)
        else:
            connection.sendall(self.answer or json_answer({"success": True}))


def json_answer(value, status="200 OK"):
    text = json.dumps(value).encode()
    return (f"HTTP/1.1 {status}\r\nContent-Type: application/json\r\n"
            f"Content-Length: {len(text)}\r\n\r\n").encode() + text
