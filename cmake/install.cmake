# What `cmake --install` puts where. The program finds its libraries and the plug-in from its own
# place, so that the whole may go under any prefix and be moved afterwards.
install(TARGETS ipmisel RUNTIME DESTINATION bin)
install(TARGETS tqrcore spdriver smbios ipmisel_plugin ipmistandard_plugin
        LIBRARY DESTINATION lib/ipmisel)
install(DIRECTORY include/tqr DESTINATION include)
install(FILES plugins/ipmisel/texts/ipmisel.INI DESTINATION lib/ipmisel)
install(FILES README.md CHANGELOG.md CONTRIBUTING.md LICENSE NOTICE DESTINATION share/doc/ipmisel)
install(DIRECTORY docs examples DESTINATION share/doc/ipmisel)
