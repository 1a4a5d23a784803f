run all quazor run --all --format json
