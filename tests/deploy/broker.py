"""A broker of Kafka in this process: the one that librdkafka has for tests."""
import ctypes

COPY = 2  # RD_KAFKA_MSG_F_COPY: the library copies the message
ANY_PARTITION = -1
PRODUCER = 0
FLUSH_MS = 10_000
POINTER, TEXT, NUMBER, SIZE = ctypes.c_void_p, ctypes.c_char_p, ctypes.c_int, ctypes.c_size_t


def function(library, name, result, *arguments):
    found = getattr(library, f"rd_kafka_{name}")
    found.restype, found.argtypes = result, arguments
    return found


class Broker:
    def __init__(self, topic):
        library = ctypes.CDLL("librdkafka.so.1")
        self.complaint = ctypes.create_string_buffer(512)
        self.new_conf = function(library, "conf_new", POINTER)
        self.set = function(library, "conf_set", NUMBER, POINTER, TEXT, TEXT, TEXT, SIZE)
        self.new_client = function(library, "new", POINTER, NUMBER, POINTER, TEXT, SIZE)
        self.new_topic = function(library, "topic_new", POINTER, POINTER, TEXT, POINTER)
        self.produce = function(
            library, "produce", NUMBER, POINTER, ctypes.c_int32, NUMBER, TEXT, SIZE, TEXT, SIZE, POINTER
        )
        self.flush = function(library, "flush", NUMBER, POINTER, NUMBER)
        new_cluster = function(library, "mock_cluster_new", POINTER, POINTER, NUMBER)
        create = function(library, "mock_topic_create", NUMBER, POINTER, TEXT, NUMBER, NUMBER)
        addresses = function(library, "mock_cluster_bootstraps", TEXT, POINTER)

        self.topic = topic.encode()
        self.cluster = new_cluster(self.client(b"127.0.0.1:1"), 1)  # of a client that talks to no broker
        create(self.cluster, self.topic, 1, 1)
        self.address = addresses(self.cluster).decode()

    def client(self, address):
        conf = self.new_conf()
        for name, value in ((b"bootstrap.servers", address), (b"log_level", b"0")):
            self.set(conf, name, value, self.complaint, len(self.complaint))
        return self.new_client(PRODUCER, conf, self.complaint, len(self.complaint))

    def send(self, messages):
        """Returns when the broker has the messages; false when it has not."""
        producer = self.client(self.address.encode())
        topic = self.new_topic(producer, self.topic, None)
        for message in messages:
            if self.produce(topic, ANY_PARTITION, COPY, message, len(message), None, 0, None) != 0:
                return False
        return self.flush(producer, FLUSH_MS) == 0
