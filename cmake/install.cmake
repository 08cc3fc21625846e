# What `cmake --install` puts where. The program finds its libraries and the plug-in from its own
# place, so that the whole may go under any prefix and be moved afterwards.
install(TARGETS ipmisel RUNTIME DESTINATION bin)
if(TARGET ipmisel-simulator)
  # Where it was built: tools/demo builds what collects alone.
  install(TARGETS ipmisel-simulator RUNTIME DESTINATION bin OPTIONAL)
endif()
install(TARGETS tqrcore spdriver smbios ipmisel_plugin ipmistandard_plugin
        LIBRARY DESTINATION lib/ipmisel)
install(DIRECTORY include/tqr DESTINATION include)
install(FILES plugins/ipmisel/texts/ipmisel.INI DESTINATION lib/ipmisel)
install(FILES README.md CHANGELOG.md CONTRIBUTING.md LICENSE NOTICE DESTINATION share/doc/ipmisel)
install(DIRECTORY docs examples DESTINATION share/doc/ipmisel)

set(completions ${PROJECT_SOURCE_DIR}/packaging/completions)
install(FILES ${completions}/ipmisel.bash DESTINATION share/bash-completion/completions RENAME ipmisel)
install(FILES ${completions}/_ipmisel DESTINATION share/zsh/site-functions)
install(FILES ${completions}/ipmisel.fish DESTINATION share/fish/vendor_completions.d)

# Manual pages are made of the documents and of the program's own help, by tools that a build does without.
find_package(Python3 COMPONENTS Interpreter)
find_program(IPMISEL_LOWDOWN lowdown DOC "Makes manual pages of documents (package lowdown)")
find_program(IPMISEL_HELP2MAN help2man DOC "Makes manual pages of a program's help (package help2man)")
if(Python3_FOUND AND IPMISEL_LOWDOWN AND IPMISEL_HELP2MAN)
  install(CODE "execute_process(COMMAND ${Python3_EXECUTABLE} ${PROJECT_SOURCE_DIR}/packaging/man/make_pages.py
                                $<TARGET_FILE:ipmisel> \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/share/man\"
                                COMMAND_ERROR_IS_FATAL ANY)")
else()
  message(STATUS "lowdown or help2man is missing: no manual pages are installed")
endif()
