"""Serves the metrics of many simulated hosts from one process, lets a real Prometheus scrape them, and measures that.

Each host is a state machine of its own, made from the seed and the number of the host. Its array ports are quiet or busy, and its links
change now and then. Hosts share the ports of arrays. Every metric with many series is simulated, with realistic labels. A real sensor
has about twenty series more: the rest of tavik_state, tavik_luns and tavik_open_warnings. Called by scripts/fleet-sim.
"""
import http.server
import json
import os
import random
import socket
import subprocess
import sys
import tempfile
import threading
import time
import urllib.parse
import urllib.request

HOSTS_PER_ARRAY = 20
PORTS_PER_ARRAY = 8
ARRAYS_PER_HOST = 2
KINDS = ("plogi prlo adisc lsrjt logo rscn fabric-busy port-busy fcp-read-check queue-full device-busy check-condition lun-reset "
         "target-reset bus-reset queue-depth port-interrupt link temperature adapter-arrival").split()
SEEN = ("queue-full", "check-condition", "logo", "plogi")  # kinds that a host has of each port after some months
STATES = ("off", "listening", "failed", "no_rights", "no_source")
LISTENING = ("rscn", "link", "queue-full", "check-condition", "device-busy", "adapter-arrival")
REASONS = ("collection-off", "total-limit", "unknown-board", "no-list", "too-short", "unknown-kind", "failed")


def wwn(prefix, number):
    text = f"{prefix:04x}{number:012x}"
    return ":".join(text[i:i + 2] for i in range(0, 16, 2))


class Host:
    """One simulated sensor. Its counters only rise; its text is made anew at each scrape."""

    def __init__(self, number, hosts, seed):
        self.random = random.Random(f"{seed} {number}")
        self.time = 0.0
        self.initiators = [wwn(0x1000, 2 * number + i) for i in range(2)]
        arrays = max(ARRAYS_PER_HOST, hosts // HOSTS_PER_ARRAY)
        chosen = {number % arrays} | set(self.random.sample(range(arrays), ARRAYS_PER_HOST - 1))
        self.ports = [wwn(0x5006, array * PORTS_PER_ARRAY + i) for array in chosen for i in range(PORTS_PER_ARRAY)]
        self.events = {(initiator, kind, port): self.random.randrange(1, 5000)
                       for i, initiator in enumerate(self.initiators) for port in self.ports[i::2] for kind in SEEN}
        self.events |= {(initiator, kind, ""): self.random.randrange(1, 200)
                        for initiator in self.initiators for kind in ("rscn", "link", "adapter-arrival")}
        self.names = {}
        self.busy_until = dict.fromkeys(self.ports, 0.0)
        self.next_change = {port: self.random.expovariate(1 / 900) for port in self.ports}
        self.next_link = self.random.expovariate(1 / 86400)
        self.retrievals = self.random.randrange(1000, 100000)
        self.fixed = self.make_fixed()
        self.lock = threading.Lock()

    def make_fixed(self):
        """What changes too seldom to matter here."""
        lines = ["# TYPE tavik_kind_state gauge"]
        for initiator in self.initiators:
            for kind in KINDS:
                holds = "listening" if kind in LISTENING else "no_source"
                lines += [f'tavik_kind_state{{initiator="{initiator}",kind="{kind}",state="{state}"}} {int(state == holds)}'
                          for state in STATES]
        lines.append("# TYPE tavik_refused_events_total counter")
        lines += [f'tavik_refused_events_total{{initiator="{initiator}",reason="{reason}"}} 0'
                  for initiator in self.initiators for reason in REASONS]
        lines.append("# TYPE tavik_lost_events_total counter")
        lines += [f'tavik_lost_events_total{{source="{source}"}} 0' for source in ("dropped", "gap")]
        lines.append("# TYPE tavik_initiator_info gauge")
        lines += [f'tavik_initiator_info{{host="host{7 + i}",initiator="{initiator}",node="{wwn(0x2000, i)}",speed="32 Gbit",'
                  f'state="Online"}} 1' for i, initiator in enumerate(self.initiators)]
        lines.append("# TYPE tavik_remote_port_info gauge")
        lines += [f'tavik_remote_port_info{{name="",node="",remote_port="{port}"}} 1' for port in self.ports]
        for name, kind, value in (("agent_up", "gauge", 1), ("held_bytes", "gauge", 0), ("agent_restarts_total", "counter", 0),
                                  ("gaps_total", "counter", 0), ("hook_failures_total", "counter", 0), ("store_bytes", "gauge", 9e7),
                                  ("wal_bytes", "gauge", 4e6), ("remote_ports_other", "gauge", 0)):
            lines += [f"# TYPE tavik_{name} {kind}", f"tavik_{name} {value}"]
        lines += ["# TYPE tavik_state gauge", 'tavik_state{state="collecting"} 1', 'tavik_state{state="no-adapters"} 0',
                  "# TYPE tavik_build_info gauge", 'tavik_build_info{version="3.0.1.2"} 1']
        return "\n".join(lines) + "\n"

    def name(self, key):
        """The series of an entry of the counters; made once."""
        name = self.names.get(key)
        if name is None:
            name = self.names[key] = 'tavik_events_total{initiator="%s",kind="%s",remote_port="%s"}' % key
        return name

    def count(self, initiator, kind, port, number):
        key = (initiator, kind, port)
        self.events[key] = self.events.get(key, 0) + number

    def advance(self, now):
        """Moves the state machine. A busy port answers QUEUE FULL once in a while: well below what the alerts are about."""
        step, self.time = now - self.time, now
        self.retrievals += int(step / 5) + 1
        for i, port in enumerate(self.ports):
            initiator = self.initiators[i % 2]
            if now >= self.next_change[port]:
                self.busy_until[port] = now + self.random.uniform(10, 60)
                self.next_change[port] = self.busy_until[port] + self.random.expovariate(1 / 900)
                self.count(initiator, "queue-full", port, self.random.randrange(1, 4))
                if self.random.random() < 0.05:
                    self.count(initiator, "check-condition", port, 1)
        if now >= self.next_link:
            self.next_link = now + self.random.expovariate(1 / 86400)
            initiator = self.random.choice(self.initiators)
            self.count(initiator, "link", "", 2)
            self.count(initiator, "rscn", "", 1)

    def serve(self, now, fault):
        with self.lock:
            step = now - self.time
            self.advance(now)
            if fault in self.ports:
                self.count(self.initiators[self.ports.index(fault) % 2], "queue-full", fault, max(1, int(step * 2)))
            lines = ["# TYPE tavik_events_total counter"]
            lines += [f"{self.name(key)} {number}" for key, number in self.events.items()]
            open_ports = sum(now < end for end in self.busy_until.values())
            if open_ports:
                lines += ["# TYPE tavik_open_episodes gauge", f'tavik_open_episodes{{kind="queue-full"}} {open_ports}']
            for name, kind, value in (("retrievals_total", "counter", self.retrievals),
                                      ("retrieved_bytes_total", "counter", self.retrievals * 96),
                                      ("last_event_timestamp_seconds", "gauge", f"{time.time():.3f}"),
                                      ("last_retrieval_timestamp_seconds", "gauge", f"{time.time():.3f}")):
                lines += [f"# TYPE tavik_{name} {kind}", f"tavik_{name} {value}"]
            return "\n".join(lines) + "\n" + self.fixed


class Fleet(http.server.ThreadingHTTPServer):
    daemon_threads = True
    request_queue_size = 1024

    def __init__(self, hosts, seed):
        super().__init__(("127.0.0.1", 0), Handler)
        self.hosts = [Host(i, hosts, seed) for i in range(hosts)]
        self.begin = time.monotonic()
        self.fault = None

    def handle_error(self, request, client_address):
        """A scrape that was given up shows in Prometheus."""


class Handler(http.server.BaseHTTPRequestHandler):
    protocol_version = "HTTP/1.1"

    def do_GET(self):
        number = int(self.path.split("/")[1])
        body = self.server.hosts[number].serve(time.monotonic() - self.server.begin, self.server.fault).encode()
        self.send_response(200)
        self.send_header("Content-Type", "text/plain; version=0.0.4")
        self.send_header("Content-Length", str(len(body)))
        self.end_headers()
        self.wfile.write(body)

    def log_message(self, *_):
        pass


class Prometheus:
    """A real one, over the fleet, with the rules of deploy/."""

    def __init__(self, folder, fleet, interval):
        with socket.create_server(("127.0.0.1", 0)) as free:
            self.port = free.getsockname()[1]
        targets = [{"targets": [f"127.0.0.1:{fleet.server_address[1]}"],
                    "labels": {"__metrics_path__": f"/{i}/metrics", "instance": f"host{i:05}"}} for i in range(len(fleet.hosts))]
        with open(f"{folder}/targets.json", "w") as file:
            json.dump(targets, file)
        for name in ("recording.yml", "alerts.yml"):
            with open(f"deploy/prometheus/{name}") as source, open(f"{folder}/{name}", "w") as file:
                for line in source:
                    file.write("        for: 5s\n" if line.startswith("        for: 2m") else line)
        with open(f"{folder}/prometheus.yml", "w") as file:
            file.write(f"global: {{scrape_interval: {interval}s, scrape_timeout: {interval}s, evaluation_interval: {interval}s}}\n"
                       "rule_files: [recording.yml, alerts.yml]\n"
                       "scrape_configs:\n  - job_name: tavik\n    sample_limit: 50000\n"
                       "    file_sd_configs: [{files: [targets.json]}]\n"
                       f"  - job_name: prometheus\n    static_configs: [{{targets: ['127.0.0.1:{self.port}']}}]\n")
        self.process = subprocess.Popen(
            ["prometheus", f"--config.file={folder}/prometheus.yml", f"--storage.tsdb.path={folder}/tsdb",
             f"--web.listen-address=127.0.0.1:{self.port}", "--log.level=error"], stderr=open(f"{folder}/log", "w"))

    def get(self, path, **parameters):
        url = f"http://127.0.0.1:{self.port}/api/v1/{path}?{urllib.parse.urlencode(parameters)}"
        with urllib.request.urlopen(url, timeout=60) as answer:
            return json.load(answer)["data"]

    def value(self, expression):
        result = self.get("query", query=expression)["result"]
        return float(result[0]["value"][1]) if result else None

    def wait(self, what, seconds, condition):
        end = time.monotonic() + seconds
        while time.monotonic() < end:
            try:
                result = condition()
                if result:
                    return result
            except (OSError, ValueError):
                pass
            if self.process.poll() is not None:
                sys.exit("fleet-sim: Prometheus has ended")
            time.sleep(1)
        sys.exit(f"fleet-sim: waited {seconds} s for {what}")

    def end(self):
        self.process.terminate()
        self.process.wait()


def measure(hosts, seed, interval):
    """One row of the table. Ends the program where the planted fault does not raise exactly its alert."""
    fleet = Fleet(hosts, seed)
    threading.Thread(target=fleet.serve_forever, daemon=True).start()
    with tempfile.TemporaryDirectory() as folder:
        prometheus = Prometheus(folder, fleet, interval)
        try:
            prometheus.wait(f"{hosts} hosts that are up", 60 + 4 * interval,
                            lambda: prometheus.value('sum(up{job="tavik"})') == hosts)
            evaluations = "min(prometheus_rule_group_iterations_total)"
            first = prometheus.wait("the rules", 60, lambda: prometheus.value(evaluations))
            prometheus.wait("four evaluations of the rules", 60 + 8 * interval, lambda: prometheus.value(evaluations) >= first + 4)
            early = prometheus.get("alerts")["alerts"]
            row = {
                "hosts": hosts,
                "series": int(prometheus.value("prometheus_tsdb_head_series")),
                "memory": prometheus.value('process_resident_memory_bytes{job="prometheus"}'),
                "scrape_mean": prometheus.value('avg(scrape_duration_seconds{job="tavik"})'),
                "scrape_most": prometheus.value('max(scrape_duration_seconds{job="tavik"})'),
                "samples": prometheus.value('avg(scrape_samples_scraped{job="tavik"})'),
            }
            rules = [rule for group in prometheus.get("rules")["groups"] for rule in group["rules"]]
            row["rules"] = {rule["name"]: rule["evaluationTime"] for rule in rules}
            unwell = [rule["name"] for rule in rules if rule["health"] != "ok"]
            if early or unwell:
                sys.exit(f"fleet-sim: {hosts} quiet hosts: alerts {early}, rules that fail {unwell}")
            fleet.fault = fleet.hosts[0].ports[0]
            sharing = sum(fleet.fault in host.ports for host in fleet.hosts)
            prometheus.wait("the alert on the planted fault", 120 + 8 * interval,
                            lambda: any(alert["state"] == "firing" for alert in prometheus.get("alerts")["alerts"]))
            time.sleep(2 * interval)
            alerts = prometheus.get("alerts")["alerts"]
            if [(alert["labels"]["alertname"], alert["labels"].get("remote_port")) for alert in alerts] != \
                    [("TavikArrayPortOverloaded", fleet.fault)]:
                sys.exit(f"fleet-sim: the planted fault raised {[alert['labels'] for alert in alerts]}")
            row["sharing"] = sharing
            return row
        finally:
            prometheus.end()
            fleet.shutdown()
            fleet.server_close()


def main(seed, interval, sizes):
    rows = []
    try:
        for hosts in sizes:
            row = measure(hosts, seed, interval)
            rows.append(row)
            print(f"fleet-sim: {hosts} hosts: the fault of a port that {row['sharing']} hosts share raised its alert, and no other",
                  flush=True)
    finally:
        if rows:
            show(rows, interval)


def show(rows, interval):
    print(f"\nscraped every {interval} s, {os.cpu_count()} processors\n")
    print("| hosts | series | series a host | memory MiB | mean scrape ms | longest scrape ms | all rules ms |\n|--:|--:|--:|--:|--:|--:|--:|")
    for row in rows:
        print(f"| {row['hosts']:,} | {row['series']:,} | {row['samples']:.0f} | {row['memory'] / 2**20:,.0f} | "
              f"{row['scrape_mean'] * 1000:.1f} | {row['scrape_most'] * 1000:.1f} | {sum(row['rules'].values()) * 1000:,.1f} |")
    print("\n| rule: ms an evaluation | " + " | ".join(f"{row['hosts']:,} hosts" for row in rows) + " |\n|---|" + "--:|" * len(rows))
    for name in rows[0]["rules"]:
        print(f"| `{name}` | " + " | ".join(f"{row['rules'][name] * 1000:,.2f}" for row in rows) + " |")


main(sys.argv[1], int(sys.argv[2]), [int(size) for size in sys.argv[3:]])
