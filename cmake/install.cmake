# What `cmake --install` puts where. The program finds its libraries and the plug-in from its own
# place, so that the whole may go under any prefix and be moved afterwards.
set_target_properties(tqrcore spdriver smbios PROPERTIES BUILD_WITH_INSTALL_RPATH ON
                                                         INSTALL_RPATH "\$ORIGIN")

install(TARGETS ipmisel RUNTIME DESTINATION bin)
install(TARGETS tqrcore spdriver smbios LIBRARY DESTINATION lib)
install(TARGETS ipmisel_plugin ipmistandard_plugin LIBRARY DESTINATION lib/ipmisel)
install(FILES plugins/ipmisel/texts/ipmisel.INI DESTINATION lib/ipmisel)
install(FILES README.md CHANGELOG.md LICENSE NOTICE DESTINATION share/doc/ipmisel)
install(DIRECTORY examples DESTINATION share/doc/ipmisel FILES_MATCHING PATTERN "*.json")
install(DIRECTORY examples/prometheus DESTINATION share/doc/ipmisel/examples)
install(DIRECTORY docs/schema DESTINATION share/doc/ipmisel FILES_MATCHING PATTERN "*.json")
