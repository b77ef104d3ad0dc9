// What router.so shows: the entry point, the table, the handlers and the working classes.
#ifndef ROUTER_EXPORT_H
#define ROUTER_EXPORT_H

#define ROUTER_EXPORT __attribute__((visibility("default")))

#endif
