# The surface's report descriptor, parsed back by a test-only walker that follows the host parser's rules.
tolka_add_test(ReportDescriptorTest SOURCES ReportDescriptorTest.cpp LIBS tolka_common)
