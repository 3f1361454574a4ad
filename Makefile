# The same doors as ./run, for those whose fingers type make.
COMMANDS := demo test build bench bench-growth bench-counts format lint install check-arch \
            check-reproducible check-threads check-all coverage fuzz mutate sbom soak clean help

.DEFAULT_GOAL := help
.PHONY: $(COMMANDS)
$(COMMANDS):
	@./run $@
