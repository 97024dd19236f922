# The Debian package and the RPM: the same files, and the scripts of each kind.
set(CPACK_PACKAGE_NAME tolkwd)
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_PACKAGE_CONTACT "The tolkwd maintainers <maintainers@tolkwd.example>")
set(CPACK_PACKAGE_VENDOR "The tolkwd maintainers")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY
  "service watchdog that restarts services with their dependents")
set(CPACK_PACKAGE_DESCRIPTION
"tolkwd asks the service command whether each configured service runs, and a
command of the operator's whether it works. A service that keeps failing is
stopped and started again, together with the services that depend on it, in a
fixed order. The configuration is read afresh every few hours.
tolkwd-check tells beforehand what the daemon will make of a configuration,
tolkwd-report afterwards what became of each service.
Nothing is enabled or started before there is a configuration.")
set(CPACK_PACKAGE_DIRECTORY ${PROJECT_SOURCE_DIR}/build/packages)
set(CPACK_GENERATOR DEB RPM)
# The programs keep their debug information in the build folder only.
set(CPACK_STRIP_FILES ON)
# Some paths are absolute, see CMakeLists.txt.
set(CPACK_SET_DESTDIR ON)
set(CPACK_PACKAGE_RELOCATABLE OFF)
set(CPACK_INSTALL_PREFIX /usr)
set(CPACK_PRE_BUILD_SCRIPTS ${CMAKE_CURRENT_SOURCE_DIR}/folders.cmake)
set(CPACK_PROJECT_CONFIG_FILE ${CMAKE_CURRENT_SOURCE_DIR}/kinds.cmake)

set(debian ${CMAKE_CURRENT_SOURCE_DIR}/debian)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_RELEASE 1)
set(CPACK_DEBIAN_PACKAGE_SECTION admin)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# The functions that the init script uses.
set(CPACK_DEBIAN_PACKAGE_DEPENDS "sysvinit-utils (>= 3.05-4)")
set(CPACK_DEBIAN_PACKAGE_CONTROL_EXTRA
  ${debian}/conffiles ${debian}/postinst ${debian}/postrm ${debian}/prerm)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)

# A version that CHANGELOG.md does not tell about is not packaged.
file(STRINGS ${PROJECT_SOURCE_DIR}/CHANGELOG.md release_date
  REGEX "^## ${PROJECT_VERSION} - [0-9-]+$")
if(NOT release_date)
  message(FATAL_ERROR "CHANGELOG.md has no heading \"## ${PROJECT_VERSION} - DATE\"")
endif()
string(REGEX REPLACE ".* " "" release_date "${release_date}")
function(format_date result)
  execute_process(COMMAND env LC_ALL=C date --utc --date ${release_date} ${ARGN}
    OUTPUT_VARIABLE text OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
  set(${result} ${text} PARENT_SCOPE)
endfunction()
format_date(debian_date --rfc-email)
format_date(rpm_date "+%a %b %d %Y")
configure_file(${debian}/changelog.in changelog.Debian @ONLY)

set(rpm ${CMAKE_CURRENT_SOURCE_DIR}/rpm)
set(CPACK_RPM_FILE_NAME RPM-DEFAULT)
set(CPACK_RPM_PACKAGE_DESCRIPTION "${CPACK_PACKAGE_DESCRIPTION}")
# Without it every ping would fail.
set(CPACK_RPM_PACKAGE_REQUIRES /usr/sbin/service)
set(CPACK_RPM_PACKAGE_RELEASE 1)
configure_file(${rpm}/changelog.in changelog.rpm @ONLY)
set(CPACK_RPM_CHANGELOG_FILE ${CMAKE_CURRENT_BINARY_DIR}/changelog.rpm)
# The others are those of what the pages of tolkwd-report draw with, see debian/copyright.
set(CPACK_RPM_PACKAGE_LICENSE "Apache-2.0 AND BSD-3-Clause AND MIT")
# Links by build id are for programs whose debug information is packaged, too.
set(CPACK_RPM_SPEC_MORE_DEFINE "%define _build_id_links none")
set(CPACK_RPM_PACKAGE_GROUP "System Environment/Daemons")
set(CPACK_RPM_POST_INSTALL_SCRIPT_FILE ${rpm}/post)
set(CPACK_RPM_PRE_UNINSTALL_SCRIPT_FILE ${rpm}/preun)
set(CPACK_RPM_POST_UNINSTALL_SCRIPT_FILE ${rpm}/postun)
file(STRINGS ${debian}/conffiles kept)
list(TRANSFORM kept PREPEND "%config(noreplace) ")
# Named, or their absolute paths would make configuration files of them, too.
set(CPACK_RPM_USER_FILELIST ${kept} "%attr(0755,root,root) /opt/varden/tolk/bin/tolkwd"
  "%attr(0755,root,root) /opt/varden/tolk/bin/tolkwd-check"
  "%attr(0755,root,root) /opt/varden/tolk/bin/tolkwd-report")
# Folders of the system, which are not this package's.
set(CPACK_RPM_EXCLUDE_FROM_AUTO_FILELIST_ADDITION
  /etc /etc/default /etc/init.d /etc/opt /opt /usr/lib/systemd /usr/lib/systemd/system
  /usr/bin /usr/sbin /usr/share/bash-completion /usr/share/bash-completion/completions
  /usr/share/man /usr/share/man/man1 /usr/share/man/man5 /usr/share/man/man8)

include(CPack)
