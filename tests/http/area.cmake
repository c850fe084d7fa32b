#The tests talk to real cpp - httplib servers on loopback.
target_link_libraries(${target} PRIVATE mapcore_httplib)
