# Tests of the host stand-ins: run loop, dispatch queue, thread priority and device handles.
tolka_add_test(RunLoopTest SOURCES RunLoopTest.cpp LIBS tolka_platform)
tolka_add_test(DispatchQueueTest SOURCES DispatchQueueTest.cpp LIBS tolka_platform)
tolka_add_test(ThreadPriorityTest SOURCES ThreadPriorityTest.cpp LIBS tolka_platform)
tolka_add_test(SimulatedHIDDeviceTest SOURCES SimulatedHIDDeviceTest.cpp LIBS tolka_platform)
tolka_add_test(HidrawDeviceTest SOURCES HidrawDeviceTest.cpp LIBS tolka_platform)
