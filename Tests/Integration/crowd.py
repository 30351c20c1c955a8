"""One application of a crowd: many connections that ask at once. A program of its own, so that the daemon takes it for one."""

import json
import selectors
import sys
import time

from accounts import FACEBOOK, GRANTED, MANAGER, NAME, OBJECT, PENDING, Caller, facebook_options
from bus_wire import ERROR, MEMBER, PATH, REPLY_SERIAL, SLOWNESS, Message

# What each connection asks, one after another without waiting; each begins at another question.
QUESTIONS = [
    ("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, facebook_options(), {}]),
    ("GetCredentialDescriptor", "sa{sv}", [FACEBOOK, {}]),
    ("ListGrants", "sa{sv}", [FACEBOOK, {}]),
    ("RequestAccess", "sa{sv}a{sv}", ["nonsense", {}, {}]),
    ("Revoke", "ssa{sv}", [FACEBOOK, "org.example.nobody", {}]),
]
LONGEST_WAIT = 60 * SLOWNESS


def all_read_from(descriptors) -> list[str]:
    """What each descriptor brings to its end."""
    contents = []
    for descriptor in descriptors:
        with open(descriptor, encoding="utf-8") as pipe:
            contents.append(pipe.read())
    return contents


def problem_with(question: int, answer: Message, token: str, clients: set[str]) -> str | None:
    """What is wrong with the answer to a question, or None."""
    if answer.kind == ERROR:
        expected = {3: "InvalidArguments", 4: "NoSuchClient"}.get(question)
        name = answer.fields[4].rpartition(".")[2]
        return None if name == expected else f"question {question} is answered with the error {name}: {answer.values}"
    values = answer.values
    is_right = [lambda: values == ["/", GRANTED, {}], lambda: all_read_from(answer.descriptors) == [token],
                lambda: {row["client"] for row in values[0]} == clients, lambda: False, lambda: False][question]()
    return None if is_right else f"question {question} is answered {values}"


def ask_all(callers: list[Caller]) -> list[dict[int | str, int]]:
    """Each caller's questions under their serial numbers; later also under the path of a request that waits."""
    asked = []
    for place, caller in enumerate(callers):
        questions = {}
        for step in range(len(QUESTIONS)):
            question = (place + step) % len(QUESTIONS)
            questions[caller.start(*QUESTIONS[question])] = question
        asked.append(questions)
    return asked


def response_to(message: Message) -> str | None:
    """The path of the request whose outcome this signal brings, or None."""
    return message.fields.get(PATH) if message.fields.get(MEMBER) == "Response" else None


def take_answers(callers: list[Caller], asked: list[dict[int | str, int]], token: str, clients: set[str]) -> list[str]:
    problems = []
    waiting = sum(map(len, asked))
    deadline = time.monotonic() + LONGEST_WAIT
    with selectors.DefaultSelector() as selector:
        for caller, questions in zip(callers, asked):
            selector.register(caller, selectors.EVENT_READ, (caller, questions))
        while waiting > 0 and time.monotonic() < deadline:
            for key, _ in selector.select(1):
                caller, questions = key.data
                caller.receive()
                for answer in caller.inbox:
                    question = questions.pop(response_to(answer) or answer.fields.get(REPLY_SERIAL), None)
                    if question == 0 and answer.values[1:2] == [PENDING]:
                        # One before it in its application's line was not through yet: the outcome comes as a signal.
                        questions[answer.values[0]] = question
                        continue
                    if question == 0 and response_to(answer):
                        answer.values.insert(0, "/")
                    if question is None:
                        if answer.fields.get(3) != "NameAcquired":
                            problems.append(f"an answer that nobody waits for: {answer.fields}")
                        continue
                    waiting -= 1
                    problem = problem_with(question, answer, token, clients)
                    problems += [problem] if problem else []
                caller.inbox.clear()
    return problems + ([f"{waiting} questions were never answered"] if waiting else [])


def main() -> None:
    bus, count, token, *clients = sys.argv[1:]
    callers = [Caller(bus) for _ in range(int(count))]
    print("ready", flush=True)
    sys.stdin.readline()
    began = time.monotonic()
    asked = ask_all(callers)
    answers = sum(map(len, asked))
    problems = take_answers(callers, asked, token, set(clients))
    took = time.monotonic() - began
    # The answer to one more question comes after everything that was still under way to the connection.
    for caller in callers:
        caller.inbox.clear()
        if caller.call(NAME, OBJECT, "org.freedesktop.DBus.Properties", "Get", "ss", [MANAGER, "version"]) != [1]:
            problems.append("the version is not 1")
        problems += [f"an answer came twice: {answer.fields}" for answer in caller.inbox]
    print(json.dumps({"answers": answers, "seconds": round(took, 3), "problems": problems[:20]}), flush=True)
    sys.stdin.readline()


if __name__ == "__main__":
    main()
