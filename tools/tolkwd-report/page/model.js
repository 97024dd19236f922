// The data of the page as the rest of it wants them.

function readspan(data, states, beginning) {
    const [state, inferred, from, to, fromclock = from, toclock = to] = data;
    return {
        state,
        word: states[state],
        inferred: inferred === 1,
        from,
        to,
        fromclock: beginning + fromclock,
        toclock: beginning + toclock,
    };
}

function readoutage(data, beginning) {
    if (data === null) {
        return null;
    }
    const {from, to} = data;
    return {from: from[0], fromclock: beginning + from[1], to: to === null ? null : to[0]};
}

function readmark(data, kinds, beginning) {
    const [kind, inferred, at, clock, words] = data;
    return {kind: kinds[kind], inferred: inferred === 1, at, clock: beginning + clock, words};
}

function readservice(data, id, {states, clock: beginning}) {
    const read = (span) => readspan(span, states, beginning);
    return {
        ...data,
        id,
        name: data.name || '(no name)',
        folded: data.name.toLowerCase(),
        now: read(data.now),
        lastoutage: readoutage(data.lastoutage, beginning),
        spans: data.spans.map(read),
        marks: [],
    };
}

// [elapsed, clock] of everything that is dated.
function* momentsof(data) {
    yield* [data.log.from, data.log.to].filter((moment) => moment !== null);
    for (const service of data.services) {
        for (const [, , from, to, fromclock = from, toclock = to] of service.spans) {
            yield [from, fromclock];
            yield [to, toclock];
        }
    }
    for (const [, [, , elapsed, clock]] of data.marks) {
        yield [elapsed, clock];
    }
}

// What the time lines go from and to. A log of one instant gets some room around it.
function extentof(moments) {
    const [from, to] = d3.extent(moments, ([elapsed]) => elapsed);
    if (from === undefined) {
        return {from: 0, to: 1};
    }
    return from === to ? {from: from - 30, to: to + 30} : {from, to};
}

function readmodel(data) {
    const moments = [...momentsof(data)];
    const services = data.services.map((service, id) => readservice(service, id, data));
    for (const [id, mark] of data.marks) {
        services[id]?.marks.push(readmark(mark, data.kinds, data.clock));
    }
    for (const service of services) {
        service.marks.sort((a, b) => a.at - b.at);
    }
    return {
        log: data.log,
        loadfailed: data.loadfailed,
        states: data.states,
        troubles: data.troubles,
        services,
        clock: new Clock(data.clock, moments),
        extent: extentof(moments),
    };
}

// The marks of a service in a stretch; one at its end belongs to the next.
function marksin(service, from, to) {
    const place = d3.bisector((mark) => mark.at).left;
    return service.marks.slice(place(service.marks, from), place(service.marks, to));
}
