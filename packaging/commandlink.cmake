# Run by CPack on the staged package tree: /usr/bin/tarnova-agent, a link to the launcher, so that
# the command is on PATH; the launcher finds its install directory through the link.
set(_link ${CPACK_TEMPORARY_INSTALL_DIRECTORY}/usr/bin/tarnova-agent)
file(MAKE_DIRECTORY ${CPACK_TEMPORARY_INSTALL_DIRECTORY}/usr/bin)
file(CREATE_LINK ${CPACK_PACKAGING_INSTALL_PREFIX}/bin/tarnova-agent ${_link} SYMBOLIC)
