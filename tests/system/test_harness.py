"""What the other tests rely on in the harness."""

from conftest import SANITIZER, syslog_line


def test_a_line_is_stamped_like_the_system_logger_stamps(agent):
    line = syslog_line("hello", source="su[7]", host="h")
    assert line.endswith(" h su[7]: hello\n")
    assert line[3] == " " and line[6] == " " and line[9] == ":" and line[12] == ":"


def test_a_changed_configuration_has_a_changed_modification_time(agent):
    agent.configure("/a")
    before = agent.logs_conf.stat().st_mtime
    agent.configure("/b")
    assert int(agent.logs_conf.stat().st_mtime) != int(before)


def test_findings_of_sanitizers_are_recognised(agent):
    assert SANITIZER.search("==12==ERROR: AddressSanitizer: heap-use-after-free")
    assert SANITIZER.search("WARNING: ThreadSanitizer: data race (pid=1)")
    assert SANITIZER.search("a.cpp:3:1: runtime error: signed integer overflow")
    assert not SANITIZER.search("Error opening file")
