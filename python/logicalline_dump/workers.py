"""Worker processes forked from this one, each taking tasks down a pipe of its own and answering
up another: no imports or set-up beyond the fork, and a few bytes of pickle per task and answer.
A worker starts with everything this process holds at the fork, so a task can be a few numbers
that point into it."""

import contextlib
import gc
import os
import pickle
import select
import signal
import struct

HEADER = struct.Struct("<Q")  # the length of the pickle that follows


def send(fd, value):
    data = pickle.dumps(value, pickle.HIGHEST_PROTOCOL)
    data = memoryview(HEADER.pack(len(data)) + data)
    while data:
        data = data[os.write(fd, data):]


def read_exactly(fd, size):
    parts = []
    while size:
        part = os.read(fd, min(size, 1 << 20))
        if not part:
            raise EOFError
        parts.append(part)
        size -= len(part)
    return b"".join(parts)


def receive(fd):
    """Returns the next value sent down fd; raises EOFError at its end."""
    (size,) = HEADER.unpack(read_exactly(fd, HEADER.size))
    return pickle.loads(read_exactly(fd, size))


@contextlib.contextmanager
def interrupts_held():
    """Holds Ctrl-C (SIGINT) back for the block, so that what the block starts is on record
    before KeyboardInterrupt can leave it: a Ctrl-C meanwhile is raised as the block ends. A
    process forked inside starts with it held too, until it chooses what to do with it."""
    held = signal.pthread_sigmask(signal.SIG_BLOCK, {signal.SIGINT})
    try:
        yield
    finally:
        signal.pthread_sigmask(signal.SIG_SETMASK, held)


class Worker:
    def __init__(self, pid, tasks, answers):
        self.pid = pid  # None once the process has been waited for
        self.tasks, self.answers = tasks, answers  # this process's ends of the two pipes
        self.pending = 0  # tasks sent and not yet answered


def serve(tasks, answers, start, work):
    """Runs start(), then work(task) for each task that comes, until the pipe closes."""
    start()
    while True:
        try:
            task = receive(tasks)
        except EOFError:
            return
        try:
            answer = (True, work(task))
        except Exception:  # a fault in the tool itself, told to the process that waits for it
            import traceback
            answer = (False, traceback.format_exc())
        send(answers, answer)


def run_worker(tasks, answers, unused, start, work):
    """The life of a forked worker, which never returns into its parent's code."""
    status = 1
    try:
        # Ctrl-C is for the parent, which ends the workers on its way out.
        signal.signal(signal.SIGINT, signal.SIG_IGN)
        # Only its own pipe ends stay open, so that each pipe ends when its one reader or
        # writer does.
        for fd in unused:
            os.close(fd)
        serve(tasks, answers, start, work)
        status = 0
    finally:
        os._exit(status)


class Workers:
    """`count` processes that run work(task) on each task they are sent, in the order sent,
    after start() once. close() ends them, waiting for them on the way."""

    def __init__(self, count, start, work):
        self.workers = []
        # What exists now is set aside from the collector, so that a worker's collections do
        # not walk, and so copy, the pages that it shares with this process.
        gc.freeze()
        try:
            for _ in range(count):
                self.spawn(start, work)
        except BaseException:  # Ctrl-C or a failed fork: no worker is left running
            self.close()
            raise
        finally:
            gc.unfreeze()

    def spawn(self, start, work):
        """Forks a worker and puts it on record before a Ctrl-C can interrupt this process."""
        with interrupts_held():
            tasks_read, tasks_write = os.pipe()
            answers_read, answers_write = os.pipe()
            pid = os.fork()
            if pid == 0:
                others = [fd for worker in self.workers for fd in (worker.tasks, worker.answers)]
                run_worker(tasks_read, answers_write, [tasks_write, answers_read, *others], start,
                           work)
            self.workers.append(Worker(pid, tasks_write, answers_read))
            os.close(tasks_read)
            os.close(answers_write)

    def send(self, task):
        """Sends the task to the worker with the fewest pending; returns that worker."""
        worker = min(self.workers, key=lambda worker: worker.pending)
        send(worker.tasks, task)
        worker.pending += 1
        return worker

    def idle(self, depth):
        """Whether some worker has fewer than `depth` tasks pending."""
        return any(worker.pending < depth for worker in self.workers)

    def answers(self):
        """Waits for answers and yields the result of each; raises RuntimeError for a task that
        failed or a worker that ended before answering."""
        busy = {worker.answers: worker for worker in self.workers if worker.pending}
        for fd in select.select(list(busy), [], [])[0]:
            worker = busy[fd]
            try:
                done, result = receive(fd)
            except EOFError:
                code = os.waitstatus_to_exitcode(os.waitpid(worker.pid, 0)[1])
                worker.pid = worker.pending = None
                how = f"killed by signal {-code}" if code < 0 else f"status {code}"
                raise RuntimeError(f"a worker process ended early ({how})") from None
            worker.pending -= 1
            if not done:
                raise RuntimeError(f"worker process {worker.pid} failed:\n{result}")
            yield result

    def close(self):
        """Ends the workers: those with no task pending as their pipe closes, the others at
        once; then waits for them."""
        for worker in self.workers:
            if worker.pending:
                os.kill(worker.pid, signal.SIGTERM)
            os.close(worker.tasks)
            os.close(worker.answers)
        for worker in self.workers:
            if worker.pid is not None:  # not waited for already
                os.waitpid(worker.pid, 0)
        self.workers = []
